// The surrogate parent's client. A conversation is one connection: the working directory and the
// command go out, a number comes back.
#include "core/log.h"
#include "core/owners.h"
#include "core/text.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <netdb.h>
#include <string_view>
#include <sys/socket.h>

namespace vlsys {

// What the ways to run a command differ in.
struct Way {
    const char *marker;  // sent after the command
    size_t buffer_size;  // holds the working directory, and the reply
    size_t request_size; // the request must fit, its NUL included
    bool logs_request;   // whole, instead of the command
    // In messages:
    const char *formatting_call;
    const char *line_feed;
    const char *recv_arguments;
};

static constexpr size_t pipe_size = 1024;
static constexpr Way waited = {"", 8192, SIZE_MAX, false, "asprintf", "\\n", ""};
static constexpr Way background = {" &", 8192, SIZE_MAX, false, "asprintf", "\n", ""};
static constexpr Way pipe_read = {" |",       pipe_size, pipe_size,    true,
                                  "snprintf", "\\n",     ", buf, 1024"};

struct Reply {
    char text[8192]; // NUL-terminated; before the reply comes, the working directory
    size_t length;
};

static Fd connect_or_warn() {
    const int socket = vlsys_surrogate_connect(0, VLSYS_SURROGATE_PORT);
    if (socket < 0)
        vlsys_log(LOG_WARNING, "%s", "can't connect surrogate parant. fallback to direct call.");
    return Fd(socket);
}

// Null, after the message, when it can't be made or is too long.
static Text make_request(const Way &way, const char *directory, const char *command) {
    Text request = format_text("%s\n%s%s\n", directory, command, way.marker);
    if (request && strlen(request.get()) >= way.request_size) {
        request.reset();
        errno = E2BIG;
    }
    if (!request)
        vlsys_log(LOG_ERR, "%s(\"%s%s%s%s\\n\"): %m", way.formatting_call, directory, way.line_feed,
                  command, way.marker);
    return request;
}

static bool send_all(int socket, std::string_view text) {
    while (!text.empty()) {
        const ssize_t sent =
            TEMP_FAILURE_RETRY(send(socket, text.data(), text.size(), MSG_NOSIGNAL));
        if (sent < 0)
            return false;
        text.remove_prefix(static_cast<size_t>(sent));
    }
    return true;
}

// `name` is what the message calls the text.
static bool send_or_log(int socket, std::string_view text, const char *name) {
    if (send_all(socket, text))
        return true;
    vlsys_log(LOG_ERR, "send(%d, \"%s\\n\", %d): %m", socket, name, static_cast<int>(text.size()));
    return false;
}

static bool receive(int socket, const Way &way, Reply *reply) {
    const ssize_t length = TEMP_FAILURE_RETRY(recv(socket, reply->text, way.buffer_size - 1, 0));
    if (length < 0) {
        vlsys_log(LOG_ERR, "recv(%d%s): %m", socket, way.recv_arguments);
        return false;
    }
    reply->length = static_cast<size_t>(length);
    reply->text[length] = '\0';
    return true;
}

// The conversation up to the reply.
static bool ask(int socket, const Way &way, const char *command, Reply *reply) {
    char *const directory = reply->text;
    if (!getcwd(directory, way.buffer_size)) {
        vlsys_log(LOG_ERR, "%s: %m", "getcwd");
        return false;
    }
    vlsys_log(LOG_DEBUG, "CWD: %s", directory);
    if (!way.logs_request)
        vlsys_log(LOG_INFO, "CMD: %s", command);
    const Text request = make_request(way, directory, command);
    if (!request)
        return false;
    if (way.logs_request)
        vlsys_log(LOG_DEBUG, "%s", request.get());
    return send_or_log(socket, request.get(), command) && receive(socket, way, reply);
}

// The number that the text begins with, clamped; `end` is where it ends.
static int parse_number(const char *text, char **end) {
    return static_cast<int>(std::clamp<long>(strtol(text, end, 10), INT_MIN, INT_MAX));
}

// A reply that is one number. errno is set in any case, for the number may be negative and no
// failed call then says why.
static bool take_number(const Reply &reply, int *number) {
    char *end = nullptr;
    *number = parse_number(reply.text, &end);
    errno = reply.length == 0 ? ECONNRESET : EPROTO;
    return end != reply.text && (end == reply.text + reply.length || *end == '\n');
}

// The number of the first line that is not empty.
static void log_process_id(Reply *reply) {
    char *const line = reply->text + strspn(reply->text, "\n");
    line[strcspn(line, "\n")] = '\0';
    if (*line != '\0')
        vlsys_log(LOG_INFO, "pid: %d", parse_number(line, nullptr));
}

} // namespace vlsys

using namespace vlsys;

int vlsys_surrogate_connect(int quiet, const char *service) {
    struct addrinfo hints = {};
    hints.ai_family = AF_INET;
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_NUMERICHOST | AI_NUMERICSERV;
    struct addrinfo *list = nullptr;
    const int error = getaddrinfo(nullptr, service, &hints, &list); // no host: loopback
    if (error == EAI_SYSTEM)
        vlsys_log(LOG_ERR, "%s: %m", "getaddrinfo");
    else if (error != 0)
        vlsys_log(LOG_ERR, "getaddrinfo: %s", gai_strerror(error));
    if (error != 0)
        return -1;
    const AddressList address(list);

    Fd connection(
        socket(address->ai_family, address->ai_socktype | SOCK_CLOEXEC, address->ai_protocol));
    if (!connection) {
        vlsys_log(LOG_ERR, "%s: %m", "socket");
        return -1;
    }
    // Called again after a signal, connect waits on for the same connection.
    if (TEMP_FAILURE_RETRY(connect(connection.get(), address->ai_addr, address->ai_addrlen)) != 0) {
        if (quiet && errno == ECONNREFUSED)
            return 0;
        vlsys_log(LOG_ERR, "%s: %m", "connect");
        return -1;
    }
    return connection.release();
}

int vlsys_system(const char *command) {
    const Fd connection = connect_or_warn();
    if (!connection)
        return system(command);
    Reply reply;
    int status = 0;
    if (!ask(connection.get(), waited, command, &reply) || !take_number(reply, &status))
        return -1;
    vlsys_log(LOG_DEBUG, "\"%s\" returned %d", command, (status >> 8) & 0xff);
    return status;
}

int vlsys_spawn(const char *command) {
    const Fd connection = connect_or_warn();
    if (!connection)
        return vlsys_spawn_direct(command);
    Reply reply;
    if (!ask(connection.get(), background, command, &reply))
        return -1;
    vlsys_log(LOG_DEBUG, "received %s", reply.text);
    int pid = 0;
    if (!take_number(reply, &pid))
        return -1;
    vlsys_log(LOG_DEBUG, "\"%s\" pid: %d", command, pid);
    return pid;
}

FILE *vlsys_popen(const char *command) {
    Fd connection = connect_or_warn();
    if (!connection)
        return popen(command, "re");
    Reply reply;
    if (!ask(connection.get(), pipe_read, command, &reply))
        return nullptr;
    log_process_id(&reply);
    if (!send_or_log(connection.get(), "start\n", "start\n"))
        return nullptr;
    FILE *const stream = fdopen(connection.get(), "r");
    if (stream)
        connection.release();
    else
        vlsys_log(LOG_ERR, "fdopen(%d): %m", connection.get());
    return stream;
}

int vlsys_pclose(FILE *stream) {
    if (!stream)
        return -1;
    const int socket = fileno(stream);
    if (!send_all(socket, "kill\n")) {
        if (errno == ENOTSOCK)
            return pclose(stream);
        vlsys_log(LOG_ERR, "send(%d, \"kill\\n\"): %m", socket);
    }
    sleep(1);
    fclose(stream);
    return 0;
}
