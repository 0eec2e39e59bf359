#include "core/wait.h"

#include <cerrno>
#include <ctime>

namespace vlsys {

void wait_seconds(int seconds) {
    struct timespec rest = {seconds, 0};
    while (nanosleep(&rest, &rest) != 0 && errno == EINTR)
        continue;
}

} // namespace vlsys
