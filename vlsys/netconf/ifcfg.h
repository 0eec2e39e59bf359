// The interface files as the running system has them, whatever the root path is.
#pragma once

#include "core/owners.h"

namespace vlsys {

// Opens an interface's file for reading. Null, with errno set, after a message that names the
// operation.
File open_ifcfg(const char *operation, const char *interface);

} // namespace vlsys
