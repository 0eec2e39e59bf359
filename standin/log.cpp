#include "standin/log.h"

#include <cstdio>
#include <cstdlib>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace unit {

int open_log() {
    struct sockaddr_un address = {AF_UNIX, "/dev/log"};
    const int receiver = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    unlink(address.sun_path);
    if (bind(receiver, reinterpret_cast<struct sockaddr *>(&address), sizeof address) != 0) {
        perror("/dev/log");
        _exit(1);
    }
    return receiver;
}

bool take_log_datagram(int receiver, std::string *datagram) {
    const ssize_t length = recv(receiver, nullptr, 0, MSG_PEEK | MSG_TRUNC | MSG_DONTWAIT);
    if (length < 0)
        return false;
    datagram->resize(static_cast<size_t>(length));
    return recv(receiver, datagram->data(), datagram->size(), 0) == length;
}

LogMessage parse_log_datagram(const std::string &datagram) {
    const size_t thread = datagram.find("]: [");
    const size_t text = thread == std::string::npos ? thread : datagram.find("]: ", thread + 4);
    const long priority = strtol(datagram.c_str() + 1, nullptr, 10);
    return {static_cast<int>(priority), datagram.substr(text == std::string::npos ? 0 : text + 3)};
}

} // namespace unit
