#include "vlsys.h"

#include <cerrno>

int vlsys_fc_cache(void) {
    const int status = vlsys_system("fc-cache");
    if (status < 0)
        return -errno;
    const bool exited = (status & 0x7f) == 0;
    return exited ? (status >> 8) & 0xff : status;
}
