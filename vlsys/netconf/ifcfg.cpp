#include "netconf/ifcfg.h"

#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"

namespace vlsys {

File open_ifcfg(const char *operation, const char *interface) {
    const Text path = format_text("%s%s", ifcfg_prefix, interface);
    if (!path) {
        vlsys_log(LOG_ERR, "asprintf(\"%s%s\"): %m", ifcfg_prefix, interface);
        return nullptr;
    }
    File file(fopen(path.get(), "re"));
    if (!file)
        vlsys_log(LOG_ERR, "%s: fopen(%s): %m", operation, path.get());
    return file;
}

} // namespace vlsys
