// The surrogate parent's client. A conversation is one connection: the working directory and the
// command go out, a number comes back.
#include "core/log.h"
#include "core/owners.h"
#include "core/text.h"
#include "core/wait.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <netdb.h>
#include <string_view>
#include <sys/socket.h>

namespace vlsys {

namespace {

// The kinds of request: a command that is waited for, one in the background, one whose output is
// read.
enum class Kind { waited, background, pipe_read };

struct Protocol {
    const char *marker;  // sent after the command
    size_t buffer_size;  // of the working directory, and of the reply, NUL included
    size_t request_size; // the request must be shorter
};

struct Reply {
    char text[8192]; // NUL-terminated
    size_t length = 0;
};

} // namespace

// By Kind.
static constexpr Protocol protocols[] = {
    {.marker = "", .buffer_size = sizeof Reply::text, .request_size = SIZE_MAX},
    {.marker = " &", .buffer_size = sizeof Reply::text, .request_size = SIZE_MAX},
    {.marker = " |", .buffer_size = 1024, .request_size = 1024},
};

static const Protocol &protocol_of(Kind kind) {
    return protocols[static_cast<size_t>(kind)];
}

// The service's address on the loopback interface; null, after the message, when it has none.
static AddressList find_address(const char *service) {
    struct addrinfo hints = {};
    hints.ai_family = AF_INET;
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_NUMERICHOST | AI_NUMERICSERV;
    struct addrinfo *list = nullptr;
    const int error = getaddrinfo(nullptr, service, &hints, &list); // no host: loopback
    if (error == EAI_SYSTEM)
        log_errno("%s", "getaddrinfo");
    else if (error != 0)
        vlsys_log(LOG_ERR, "getaddrinfo: %s", gai_strerror(error));
    return AddressList(error == 0 ? list : nullptr);
}

static Fd connect_or_warn() {
    const int socket = vlsys_surrogate_connect(0, VLSYS_SURROGATE_PORT);
    if (socket < 0)
        vlsys_log(LOG_WARNING, "%s", "can't connect surrogate parant. fallback to direct call.");
    return Fd(socket);
}

// Null, with errno set, when it cannot be made. The surrogate parent would take what follows a line
// feed in the directory or the command for another command.
static Text make_request(Kind kind, const char *directory, const char *command) {
    const Protocol &protocol = protocol_of(kind);
    if (strchr(directory, '\n') || strchr(command, '\n')) {
        errno = EINVAL;
        return nullptr;
    }
    Text request = format_text("%s\n%s%s\n", directory, command, protocol.marker);
    if (request && strlen(request.get()) >= protocol.request_size) {
        request.reset();
        errno = E2BIG;
    }
    return request;
}

static int log_request_failure(Kind kind, const char *directory, const char *command) {
    switch (kind) {
    case Kind::waited:
        return log_errno("asprintf(\"%s\\n%s\\n\")", directory, command);
    case Kind::background:
        return log_errno("asprintf(\"%s\n%s &\\n\")", directory, command);
    case Kind::pipe_read:
        break;
    }
    return log_errno("snprintf(\"%s\\n%s |\\n\")", directory, command);
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
static int send_text(int socket, std::string_view text, const char *name) {
    if (send_all(socket, text))
        return 0;
    return log_errno("send(%d, \"%s\\n\", %d)", socket, name, static_cast<int>(text.size()));
}

static int receive(int socket, Kind kind, Reply *reply) {
    const size_t size = protocol_of(kind).buffer_size;
    const ssize_t length = TEMP_FAILURE_RETRY(recv(socket, reply->text, size - 1, 0));
    if (length < 0 && kind == Kind::pipe_read)
        return log_errno("recv(%d, buf, %d)", socket, static_cast<int>(size));
    if (length < 0)
        return log_errno("recv(%d)", socket);
    reply->length = static_cast<size_t>(length);
    reply->text[length] = '\0';
    return 0;
}

// The conversation up to the reply. Returns 0, or the negated errno, logged.
static int ask(int socket, Kind kind, const char *command, Reply *reply) {
    char directory[sizeof reply->text];
    if (!getcwd(directory, protocol_of(kind).buffer_size))
        return log_errno("%s", "getcwd");
    vlsys_log(LOG_DEBUG, "CWD: %s", directory);
    if (kind != Kind::pipe_read)
        vlsys_log(LOG_INFO, "CMD: %s", command);
    const Text request = make_request(kind, directory, command);
    if (!request)
        return log_request_failure(kind, directory, command);
    if (kind == Kind::pipe_read)
        vlsys_log(LOG_DEBUG, "%s", request.get());
    const int result = send_text(socket, request.get(), command);
    return result < 0 ? result : receive(socket, kind, reply);
}

// The number that the text begins with, clamped; `end` is where it ends.
static int parse_number(const char *text, char **end) {
    return static_cast<int>(std::clamp<long>(strtol(text, end, 10), INT_MIN, INT_MAX));
}

// The number of a reply that is nothing else. Returns 0 or a negated errno, not logged.
static int take_number(const Reply &reply, int *number) {
    if (reply.length == 0)
        return -ECONNRESET;
    char *end = nullptr;
    *number = parse_number(reply.text, &end);
    const bool ends_there = end == reply.text + reply.length || *end == '\n';
    return end != reply.text && ends_there ? 0 : -EPROTO;
}

static int run_waited(const char *command, int *status) {
    if (!command)
        return -EFAULT;
    const Fd connection = connect_or_warn();
    if (!connection) {
        *status = system(command);
        return *status < 0 ? -errno : 0;
    }
    Reply reply;
    int result = ask(connection.get(), Kind::waited, command, &reply);
    if (result == 0)
        result = take_number(reply, status);
    if (result == 0)
        vlsys_log(LOG_DEBUG, "\"%s\" returned %d", command, (*status >> 8) & 0xff);
    return result;
}

static int start_in_background(const char *command, int *pid) {
    if (!command)
        return -EFAULT;
    const Fd connection = connect_or_warn();
    if (!connection) {
        *pid = vlsys_spawn_direct(command);
        return *pid < 0 ? -errno : 0;
    }
    Reply reply;
    int result = ask(connection.get(), Kind::background, command, &reply);
    if (result < 0)
        return result;
    vlsys_log(LOG_DEBUG, "received %s", reply.text);
    result = take_number(reply, pid);
    if (result == 0)
        vlsys_log(LOG_DEBUG, "\"%s\" pid: %d", command, *pid);
    return result;
}

// The number of the first line that is not empty.
static void log_process_id(Reply *reply) {
    char *const line = reply->text + strspn(reply->text, "\n");
    line[strcspn(line, "\n")] = '\0';
    if (*line != '\0')
        vlsys_log(LOG_INFO, "pid: %d", parse_number(line, nullptr));
}

// The result of a public operation. errno says why it is negative, also when the number itself is,
// and stays the caller's otherwise.
static int number_or_failure(int result, int number, int caller_errno) {
    if (result < 0) {
        errno = -result;
        return -1;
    }
    errno = number < 0 ? EPROTO : caller_errno;
    return number;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_surrogate_connect(int quiet, const char *service) {
    const AddressList address = find_address(service);
    if (!address)
        return -1;
    Fd connection(
        socket(address->ai_family, address->ai_socktype | SOCK_CLOEXEC, address->ai_protocol));
    if (!connection) {
        log_errno("%s", "socket");
        return -1;
    }
    // Called again after a signal, connect waits on for the same connection.
    if (TEMP_FAILURE_RETRY(connect(connection.get(), address->ai_addr, address->ai_addrlen)) != 0) {
        if (quiet && errno == ECONNREFUSED)
            return 0;
        log_errno("%s", "connect");
        return -1;
    }
    return connection.release();
}

int vlsys_system(const char *command) {
    const int caller_errno = errno;
    int status = 0;
    const int result = run_waited(command, &status);
    return number_or_failure(result, status, caller_errno);
}

int vlsys_spawn(const char *command) {
    const int caller_errno = errno;
    int pid = 0;
    const int result = start_in_background(command, &pid);
    return number_or_failure(result, pid, caller_errno);
}

FILE *vlsys_popen(const char *command) {
    if (!command) {
        errno = EFAULT;
        return nullptr;
    }
    Fd connection = connect_or_warn();
    if (!connection)
        return popen(command, "re");
    Reply reply;
    if (ask(connection.get(), Kind::pipe_read, command, &reply) < 0)
        return nullptr;
    if (reply.length == 0) { // an empty stream would pass for the command's output
        errno = ECONNRESET;
        return nullptr;
    }
    log_process_id(&reply);
    if (send_text(connection.get(), "start\n", "start\n") < 0)
        return nullptr;
    FILE *const stream = fdopen(connection.get(), "r");
    if (!stream) {
        log_errno("fdopen(%d)", connection.get());
        return nullptr;
    }
    connection.release();
    return stream;
}

int vlsys_pclose(FILE *stream) {
    if (!stream)
        return -1;
    const int socket = fileno(stream);
    if (!send_all(socket, "kill\n")) {
        if (errno == ENOTSOCK)
            return pclose(stream);
        log_errno("send(%d, \"kill\\n\")", socket);
    }
    wait_seconds(1);
    fclose(stream);
    return 0;
}
