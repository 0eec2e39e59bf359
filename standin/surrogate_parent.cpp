// The unit's surrogate parent: runs shell commands for local clients, on TCP 127.0.0.1:12865. Goes
// to the background once it listens.
//
// A request is two lines, the working directory and the command. A command that ends in " &" is
// started, and its process id sent; one that ends in " |" is announced with its process id, started
// at "start", its output sent as it comes and after it the wait status; "kill" ends it. Any other
// is run, and its wait status sent. A request cut short is not run.
#include "standin/loopback.h"
#include "vlsys/core/owners.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <string>
#include <sys/socket.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

using unit::say;
using vlsys::Fd;

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

// Starts the command without copying this process, which would take longer than most commands do.
static pid_t start(const std::string &directory, const std::string &command) {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addchdir_np(&actions, directory.c_str());
    const std::array<const char *, 4> words = {"sh", "-c", command.c_str(), nullptr};
    pid_t child = -1;
    const int error = posix_spawn(&child, "/bin/sh", &actions, nullptr,
                                  const_cast<char *const *>(words.data()), environ);
    posix_spawn_file_actions_destroy(&actions);
    return error == 0 ? child : -1;
}

static int wait_for(pid_t child) {
    int status = 127 << 8; // as of a shell that could not be started
    while (child > 0 && waitpid(child, &status, 0) < 0 && errno == EINTR)
        continue;
    return status;
}

[[noreturn]] static void execute(const std::string &directory, const std::string &command) {
    if (chdir(directory.c_str()) == 0)
        execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
    _exit(127);
}

// Starts the command in a process group of its own, held back until a byte comes down the gate.
static pid_t start_behind(int gate, int output, const std::string &directory,
                          const std::string &command) {
    const pid_t child = fork();
    setpgid(child, child); // in both, so that neither runs ahead of it
    if (child != 0)
        return child;
    // While it is held back it must keep nothing open that other clients wait for the end of.
    dup2(output, STDOUT_FILENO);
    dup2(gate, STDERR_FILENO + 1);
    close_range(STDERR_FILENO + 2, ~0U, 0);
    char go = 0;
    if (read(STDERR_FILENO + 1, &go, 1) != 1)
        _exit(127);
    close(STDERR_FILENO + 1);
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
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0)
        return;
    Fd childs_gate(ends[0]);
    const Fd gate(ends[1]);
    if (pipe2(ends, O_CLOEXEC) != 0)
        return;
    const Fd output(ends[0]);
    Fd childs_output(ends[1]);
    const pid_t child = start_behind(childs_gate.get(), childs_output.get(), directory, command);
    if (child < 0)
        return;
    childs_gate.reset();
    childs_output.reset();
    say_number(connection, child);
    std::string line;
    if (read_line(connection, &line) && line == "start" && say(gate.get(), "\n"))
        stream(connection, output.get(), child);
    else
        kill(-child, SIGTERM);
    say_number(connection, wait_for(child));
    shutdown(connection, SHUT_WR);
    while (read_line(connection, &line))
        continue;
}

static void serve(int accepted) {
    const Fd connection(accepted);
    std::string directory;
    std::string command;
    if (!read_line(accepted, &directory) || !read_line(accepted, &command))
        return;
    if (take_suffix(&command, " |")) {
        run_piped(accepted, directory, command);
        return;
    }
    const bool background = take_suffix(&command, " &");
    const pid_t child = start(directory, command);
    if (!background) {
        say_number(accepted, wait_for(child));
        return;
    }
    say_number(accepted, child);
    shutdown(accepted, SHUT_RDWR); // the client need not wait for the command's end
    wait_for(child);
}

int main() {
    const int listener = unit::listen_on_loopback();
    if (daemon(1, 1) != 0)
        return 1;
    for (;;) {
        const int connection = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (connection >= 0)
            std::thread(serve, connection).detach();
    }
}
