#include "core/log.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <unistd.h>

namespace vlsys {

namespace {

// The caller's signals while a child is made: SIGINT and SIGQUIT ignored, SIGCHLD blocked.
class HeldSignals {
  public:
    HeldSignals() = default;
    HeldSignals(const HeldSignals &) = delete;
    HeldSignals &operator=(const HeldSignals &) = delete;
    ~HeldSignals();

    // Returns 0, or the negated errno of the step that failed, logged.
    int hold();
    // Gives the child the caller's. Takes no lock, for another thread may have held it at the fork.
    void restore_in_child() const;

  private:
    int steps_ = 0; // of hold() that are done
    struct sigaction interrupt_ = {};
    struct sigaction quit_ = {};
    sigset_t mask_ = {};
};

int HeldSignals::hold() {
    struct sigaction ignore = {};
    ignore.sa_handler = SIG_IGN;
    if (sigaction(SIGINT, &ignore, &interrupt_) != 0)
        return log_errno("%s", "sigaction(SIGINT)");
    steps_++;
    if (sigaction(SIGQUIT, &ignore, &quit_) != 0)
        return log_errno("%s", "sigaction(SIGQUIT)");
    steps_++;
    sigset_t child_ended;
    sigemptyset(&child_ended);
    sigaddset(&child_ended, SIGCHLD);
    if (sigprocmask(SIG_BLOCK, &child_ended, &mask_) != 0)
        return log_errno("%s", "sigprocmask(SIG_BLOCK)");
    steps_++;
    return 0;
}

HeldSignals::~HeldSignals() {
    if (steps_ >= 3)
        sigprocmask(SIG_SETMASK, &mask_, nullptr);
    if (steps_ >= 2)
        sigaction(SIGQUIT, &quit_, nullptr);
    if (steps_ >= 1)
        sigaction(SIGINT, &interrupt_, nullptr);
}

void HeldSignals::restore_in_child() const {
    sigaction(SIGINT, &interrupt_, nullptr);
    sigaction(SIGQUIT, &quit_, nullptr);
    sigprocmask(SIG_SETMASK, &mask_, nullptr);
}

} // namespace

} // namespace vlsys

using namespace vlsys;

pid_t vlsys_spawn_direct(const char *command) {
    if (!command) {
        errno = EFAULT;
        return -1;
    }
    HeldSignals signals;
    if (signals.hold() < 0)
        return -1;

    vlsys_log(LOG_DEBUG, "CMD: %s", command);
    fflush(stdout); // what was printed comes before what the child prints
    const pid_t child = fork();
    if (child < 0) {
        log_errno("%s", "fork");
        return -1;
    }
    if (child == 0) {
        signals.restore_in_child();
        execl("/bin/sh", "sh", "-c", command, nullptr);
        _exit(127);
    }
    vlsys_log(LOG_DEBUG, "pid: %d", child);
    return child;
}
