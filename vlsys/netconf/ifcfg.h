// The interface files as the running system has them, whatever the root path is.
#pragma once

#include "core/owners.h"

namespace vlsys {

// An interface's file, open for reading.
struct Ifcfg {
    Text path;
    File file;
};

// Returns 0, or the negated errno after a message that names the operation.
int open_ifcfg(const char *operation, const char *interface, Ifcfg *ifcfg);

} // namespace vlsys
