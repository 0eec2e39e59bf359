// The unit's system log: prints what is sent to /dev/log, "<level> <text>" per message, until
// SIGTERM; by then all that was sent before is printed.
#include "standin/log.h"

#include <csignal>
#include <cstdio>
#include <poll.h>
#include <sys/signalfd.h>
#include <syslog.h>

static const char *const levels[] = {"emerg",   "alert",  "crit", "error",
                                     "warning", "notice", "info", "debug"};

int main() {
    sigset_t stop_signals;
    sigemptyset(&stop_signals);
    sigaddset(&stop_signals, SIGTERM);
    sigprocmask(SIG_BLOCK, &stop_signals, nullptr);
    const int stop = signalfd(-1, &stop_signals, SFD_CLOEXEC);

    const int receiver = unit::open_log();
    struct pollfd ready[] = {{receiver, POLLIN, 0}, {stop, POLLIN, 0}};
    do {
        poll(ready, 2, -1);
        for (std::string datagram; unit::take_log_datagram(receiver, &datagram);) {
            const unit::LogMessage message = unit::parse_log_datagram(datagram);
            printf("%-8s%s\n", levels[LOG_PRI(message.priority)], message.text.c_str());
            fflush(stdout);
        }
    } while (!ready[1].revents);
}
