#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"

#include <cstring>
#include <sys/stat.h>

namespace vlsys {

// 0 when it is not known.
static time_t modification_time(FILE *file) {
    struct stat status = {};
    if (fstat(fileno(file), &status) != 0) {
        log_errno("fstat(%s)", version_path);
        return 0;
    }
    return status.st_mtime;
}

static bool read_version(FILE *file, char *version, size_t size) {
    errno = 0; // an empty file is no error
    if (read_line(file, version, size) <= 0) {
        log_errno("fgets(%s)", version_path);
        return false;
    }
    version[strcspn(version, "\n")] = '\0';
    return true;
}

} // namespace vlsys

using namespace vlsys;

void vlsys_get_version(char *buffer, size_t size, time_t *time) {
    constexpr time_t default_time = 1361778840; // 2013-02-25 07:54:00 UTC
    const char *version = "1.00_SQA3";
    time_t modified = 0;
    char line[1024];
    const File file(fopen(version_path, "re"));
    if (!file) {
        log_errno("fopen(%s)", version_path);
    } else {
        modified = modification_time(file.get());
        if (read_version(file.get(), line, sizeof line))
            version = line;
    }
    vlsys_strlcpy(buffer, version, size);
    *time = modified != 0 ? modified : default_time;
}
