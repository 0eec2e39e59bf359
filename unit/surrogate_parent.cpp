// The unit's surrogate parent: runs shell commands for local clients, on TCP 127.0.0.1:12865. Goes
// to the background once it listens.
//
// A request is two lines, the working directory and the command. A command that ends in " &" is
// started, and its process id sent; one that ends in " |" is announced with its process id, started
// at "start", its output sent as it comes and after it the wait status; "kill" ends it. Any other
// is run, and its wait status sent. A request cut short is not run.
#include "unit/loopback.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <string>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

using unit::say;

static void say_number(int connection, int number) {
    say(connection, std::to_string(number) + "\n");
}

// One line without its line feed; false at the end of the connection.
static bool read_line(int connection, std::string *line) {
    line->clear();
    for (char c = 0; recv(connection, &c, 1, 0) == 1;) {
        if (c == '\n')
            return true;
        line->push_back(c);
    }
    return false;
}

static bool take_suffix(std::string *command, const char *suffix) {
    const size_t length = strlen(suffix);
    if (command->size() < length || command->compare(command->size() - length, length, suffix) != 0)
        return false;
    command->resize(command->size() - length);
    return true;
}

[[noreturn]] static void execute(const std::string &directory, const std::string &command) {
    signal(SIGPIPE, SIG_DFL);
    if (chdir(directory.c_str()) == 0)
        execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
    _exit(127);
}

static pid_t start(const std::string &directory, const std::string &command) {
    const pid_t child = fork();
    if (child == 0)
        execute(directory, command);
    return child;
}

static int wait_for(pid_t child) {
    int status = 0;
    while (waitpid(child, &status, 0) < 0 && errno == EINTR)
        continue;
    return status;
}

// Starts the command in a process group of its own, held back until a byte comes down the gate.
static pid_t start_behind(int gate, int output, const std::string &directory,
                          const std::string &command) {
    const pid_t child = fork();
    setpgid(child, child); // in both, so that neither runs ahead of it
    if (child != 0)
        return child;
    dup2(output, STDOUT_FILENO);
    char go = 0;
    if (read(gate, &go, 1) != 1)
        _exit(127);
    execute(directory, command);
}

// Sends the output on until it ends, or the client says "kill" or goes away.
static void stream(int connection, int output, pid_t child) {
    char bytes[4096];
    for (;;) {
        struct pollfd ready[] = {{output, POLLIN, 0}, {connection, POLLIN, 0}};
        if (poll(ready, 2, -1) < 0)
            continue;
        if (ready[1].revents) {
            kill(-child, SIGTERM);
            return;
        }
        const ssize_t length = read(output, bytes, sizeof bytes);
        if (length <= 0)
            return;
        say(connection, std::string(bytes, static_cast<size_t>(length)));
    }
}

static void run_piped(int connection, const std::string &directory, const std::string &command) {
    int gate[2];
    int output[2];
    if (pipe2(gate, O_CLOEXEC) != 0 || pipe2(output, O_CLOEXEC) != 0)
        return;
    const pid_t child = start_behind(gate[0], output[1], directory, command);
    close(gate[0]);
    close(output[1]);
    say_number(connection, child);
    std::string line;
    if (read_line(connection, &line) && line == "start" && write(gate[1], "", 1) == 1)
        stream(connection, output[0], child);
    close(gate[1]);
    say_number(connection, wait_for(child));
    shutdown(connection, SHUT_WR);
    while (read_line(connection, &line))
        continue;
}

static void serve(int connection) {
    std::string directory;
    std::string command;
    if (!read_line(connection, &directory) || !read_line(connection, &command))
        return;
    if (take_suffix(&command, " &"))
        say_number(connection, start(directory, command));
    else if (take_suffix(&command, " |"))
        run_piped(connection, directory, command);
    else
        say_number(connection, wait_for(start(directory, command)));
}

int main() {
    const int listener = unit::listen_on_loopback();
    if (daemon(1, 1) != 0)
        return 1;
    signal(SIGPIPE, SIG_IGN);
    for (;;) {
        const int connection = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (connection >= 0 && fork() == 0) {
            serve(connection);
            _exit(0);
        }
        close(connection);
        while (waitpid(-1, nullptr, WNOHANG) > 0)
            continue;
    }
}
