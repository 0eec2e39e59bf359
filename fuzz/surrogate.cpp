// A surrogate parent's replies.
#include "fuzz.h"

static std::string reply;

// Puts the parent, who has replied and wants nothing more, behind the client's socket.
extern "C" int __wrap_connect(int client) {
    static int ends[2] = {-1, -1};
    close(ends[0]);
    assert(socketpair(AF_UNIX, SOCK_STREAM, 0, ends) == 0 && dup2(ends[1], client) == client);
    assert(close(ends[1]) == 0 && send(ends[0], reply.data(), reply.size(), 0) >= 0);
    return shutdown(ends[0], SHUT_WR);
}

static int status_of(const std::string &text) {
    reply = text;
    const int status = vlsys_system("true");
    assert(vlsys_spawn("true") == status);
    return status;
}

static void check(Input &in) {
    const int status = status_of(in[0]);
    const std::string number = std::to_string(status);
    assert(status == -1 || has(in[0], std::to_string(labs(status))) || labs(status) >= INT32_MAX);
    assert(status_of(number + "\n" + in[0]) == status);
    if (!isdigit(in[0][0]))
        assert(status_of("7" + in[0]) == (in[0].empty() || in[0][0] == '\n' ? 7 : -1));
    reply = in[0] + std::string(1023, ' ');
    const vlsys::File stream(vlsys_popen("true"));
    in[1].resize(in[0].size());
    assert(fread(in[1].data(), 1, in[1].size() + 1, stream.get()) == in[1].size());
    assert(in[1] == reply.substr(1023));
}
