#include "core/paths.h"

namespace vlsys {

SystemPath::SystemPath(const char *fixed, const char *name) {
    text[0] = '\0'; // the getter writes nothing before the library is started
    vlsys_get_path_root(text, sizeof text);
    vlsys_strlcat(text, fixed, sizeof text);
    vlsys_strlcat(text, name, sizeof text);
}

} // namespace vlsys
