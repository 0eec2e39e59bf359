// The unit's system log: prints what is sent to /dev/log, "<level> <text>" per message, until
// SIGTERM; by then all that was sent before is printed. Of a loop's debug messages, which come over
// and over without another message between them, each is printed once, and then how many followed.
#include "standin/log.h"

#include <csignal>
#include <cstdio>
#include <poll.h>
#include <set>
#include <sys/signalfd.h>
#include <syslog.h>

static const char *const levels[] = {"emerg",   "alert",  "crit", "error",
                                     "warning", "notice", "info", "debug"};

static std::set<std::string> debug_texts; // since the last message of another level
static int repeated;

static void print_repeated() {
    if (repeated > 0)
        printf("        (%d more of these debug messages)\n", repeated);
    repeated = 0;
}

static void print(const unit::LogMessage &message) {
    const int level = LOG_PRI(message.priority);
    if (level == LOG_DEBUG && !debug_texts.insert(message.text).second) {
        repeated++;
        return;
    }
    print_repeated();
    if (level != LOG_DEBUG)
        debug_texts.clear();
    const size_t length = message.text.find_last_not_of('\n') + 1;
    printf("%-8s%s\n", levels[level], message.text.substr(0, length).c_str());
    fflush(stdout);
}

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
        for (std::string datagram; unit::take_log_datagram(receiver, &datagram);)
            print(unit::parse_log_datagram(datagram));
    } while (!ready[1].revents);
    print_repeated();
}
