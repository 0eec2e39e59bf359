#include "build_date.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"

#include <fcntl.h>

namespace vlsys {

static uint32_t start_count; // 1 while the library is started

// What is written to a closed standard descriptor, here or by a command, would go to the file or
// socket that was opened next. Commands inherit these, so they are not close-on-exec.
static void open_standard_descriptors() {
    int fd = 0;
    do
        fd = open("/dev/null", O_RDWR);
    while (fd >= 0 && fd <= STDERR_FILENO);
    const Fd surplus(fd);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_init(void) {
    if (start_count != 0) {
        vlsys_log(LOG_DEBUG, "initialized %d times", static_cast<int>(start_count));
        return 0;
    }
    open_standard_descriptors();
    vlsys_log(LOG_INFO, "vlsys %s built on %s", VLSYS_VERSION, build_date);
    const int result = set_up_paths();
    if (result < 0)
        return result;
    start_count++;
    return 0;
}

void vlsys_exit(void) {
    drop_paths();
    start_count = 0;
}
