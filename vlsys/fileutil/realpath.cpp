#include "core/log.h"
#include "core/owners.h"

#include <cstring>

using namespace vlsys;

int64_t vlsys_realpath(char *buffer, const char *path, size_t size) {
    if (!path)
        return -EFAULT;
    const Text resolved(realpath(path, nullptr));
    if (!resolved)
        return log_errno("realpath(%s, NULL)", path);
    const char *text = resolved.get();
    char absolute[VLSYS_PATH_SIZE];
    if (text[0] != '/') {
        if (!getcwd(absolute, sizeof absolute))
            return log_errno("%s", "getcwd");
        vlsys_log(LOG_DEBUG, "cwd: %s", absolute);
        vlsys_strlcat(absolute, "/", sizeof absolute);
        vlsys_strlcat(absolute, text, sizeof absolute);
        text = absolute;
    }
    return static_cast<int64_t>(buffer ? vlsys_strlcpy(buffer, text, size) : strlen(text));
}
