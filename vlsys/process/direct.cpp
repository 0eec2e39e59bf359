#include "core/log.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <unistd.h>

namespace vlsys {

// A signal ignored until the owner goes out of scope.
class IgnoredSignal {
  public:
    explicit IgnoredSignal(int signal) : signal_(signal) {
        struct sigaction ignore = {};
        ignore.sa_handler = SIG_IGN;
        done_ = sigaction(signal, &ignore, &old_) == 0;
    }
    IgnoredSignal(const IgnoredSignal &) = delete;
    IgnoredSignal &operator=(const IgnoredSignal &) = delete;
    ~IgnoredSignal() {
        if (done_)
            restore();
    }

    explicit operator bool() const { return done_; }
    void restore() const { sigaction(signal_, &old_, nullptr); }

  private:
    int signal_;
    bool done_;
    struct sigaction old_;
};

// SIGCHLD blocked until the owner goes out of scope.
class BlockedChildSignal {
  public:
    BlockedChildSignal() {
        sigset_t child;
        sigemptyset(&child);
        sigaddset(&child, SIGCHLD);
        done_ = sigprocmask(SIG_BLOCK, &child, &old_) == 0;
    }
    BlockedChildSignal(const BlockedChildSignal &) = delete;
    BlockedChildSignal &operator=(const BlockedChildSignal &) = delete;
    ~BlockedChildSignal() {
        if (done_)
            restore();
    }

    explicit operator bool() const { return done_; }
    void restore() const { sigprocmask(SIG_SETMASK, &old_, nullptr); }

  private:
    bool done_;
    sigset_t old_;
};

static pid_t failed(const char *call) {
    vlsys_log(LOG_ERR, "%s: %m", call);
    return -1;
}

[[noreturn]] static void execute(const char *command) {
    vlsys_log(LOG_DEBUG, "CMD: %s", command);
    fflush(stdout); // the line, when the log goes there
    execl("/bin/sh", "sh", "-c", command, nullptr);
    _exit(127);
}

} // namespace vlsys

using namespace vlsys;

pid_t vlsys_spawn_direct(const char *command) {
    const IgnoredSignal interrupt(SIGINT);
    if (!interrupt)
        return failed("sigaction(SIGINT)");
    const IgnoredSignal quit(SIGQUIT);
    if (!quit)
        return failed("sigaction(SIGQUIT)");
    const BlockedChildSignal child_ended;
    if (!child_ended)
        return failed("sigprocmask(SIG_BLOCK)");

    fflush(stdout); // or the child writes it a second time
    const pid_t child = fork();
    if (child < 0)
        return failed("fork");
    if (child == 0) {
        interrupt.restore();
        quit.restore();
        child_ended.restore();
        execute(command);
    }
    vlsys_log(LOG_DEBUG, "pid: %d", child);
    return child;
}
