#include "netconf/ifcfg.h"

#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"

namespace vlsys {

int open_ifcfg(const char *operation, const char *interface, Ifcfg *ifcfg) {
    ifcfg->path = format_text("%s%s", ifcfg_prefix, interface);
    if (!ifcfg->path)
        return log_errno("asprintf(\"%s%s\")", ifcfg_prefix, interface);
    ifcfg->file.reset(fopen(ifcfg->path.get(), "re"));
    if (!ifcfg->file)
        return log_errno("%s: fopen(%s)", operation, ifcfg->path.get());
    return 0;
}

} // namespace vlsys
