// The unit's system log: prints what is sent to /dev/log, "<level> <text>" per message, until
// SIGTERM; by then all that was sent before is printed.
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <poll.h>
#include <string>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

static const char *const levels[] = {"emerg",   "alert",  "crit", "error",
                                     "warning", "notice", "info", "debug"};

// "<131>Nov 24 10:00:00 ident[process id]: [thread id]: text"
static void print_message(const std::string &datagram) {
    const size_t thread = datagram.find("]: [");
    const size_t text = thread == std::string::npos ? thread : datagram.find("]: ", thread + 4);
    const long priority = strtol(datagram.c_str() + 1, nullptr, 10);
    printf("%-8s%s\n", levels[LOG_PRI(priority)],
           datagram.c_str() + (text == std::string::npos ? 0 : text + 3));
    fflush(stdout);
}

static bool print_next(int receiver) {
    std::string datagram(1 << 16, '\0');
    const ssize_t length = recv(receiver, datagram.data(), datagram.size(), MSG_DONTWAIT);
    if (length < 0)
        return false;
    datagram.resize(static_cast<size_t>(length));
    print_message(datagram);
    return true;
}

int main() {
    sigset_t stop_signals;
    sigemptyset(&stop_signals);
    sigaddset(&stop_signals, SIGTERM);
    sigprocmask(SIG_BLOCK, &stop_signals, nullptr);
    const int stop = signalfd(-1, &stop_signals, SFD_CLOEXEC);

    struct sockaddr_un address = {AF_UNIX, "/dev/log"};
    const int receiver = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    unlink(address.sun_path);
    if (bind(receiver, reinterpret_cast<struct sockaddr *>(&address), sizeof address) != 0) {
        perror("/dev/log");
        return 1;
    }
    struct pollfd ready[] = {{receiver, POLLIN, 0}, {stop, POLLIN, 0}};
    do {
        poll(ready, 2, -1);
        while (print_next(receiver))
            continue;
    } while (!ready[1].revents);
}
