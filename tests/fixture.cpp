#include "fixture.h"

#include "unit/sandbox.h"
#include "vlsys.h"

#include <algorithm>
#include <arpa/inet.h>
#include <atomic>
#include <condition_variable>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <net/if.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sstream>
#include <sys/eventfd.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <thread>
#include <unistd.h>

namespace fs = std::filesystem;

namespace test {

std::string read_file(const std::string &path) {
    std::ifstream file(path, std::ios::binary);
    EXPECT_TRUE(file) << "cannot read " << path;
    std::ostringstream content;
    content << file.rdbuf();
    return content.str();
}

void write_file(const std::string &path, const std::string &content) {
    std::ofstream file(path, std::ios::binary);
    file << content;
    file.close();
    EXPECT_TRUE(file) << "cannot write " << path;
}

std::string list_directory(const std::string &path) {
    std::vector<std::string> names;
    for (const auto &entry : fs::directory_iterator(path))
        names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    std::string list;
    for (const auto &name : names)
        list += name + "\n";
    return list;
}

unsigned mode_of(const std::string &path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status.st_mode & 07777;
}

std::string link_target(const std::string &path) {
    std::error_code error;
    return fs::read_symlink(path, error).string();
}

int open_descriptors() {
    const fs::directory_iterator all("/proc/self/fd");
    return static_cast<int>(std::distance(begin(all), end(all)));
}

long peak_memory() {
    struct rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

void run(const std::string &command) {
    ASSERT_EQ(system(command.c_str()), 0) << command;
}

Output capture(const std::string &command) {
    FILE *const pipe = popen(command.c_str(), "r");
    Output output;
    for (int c = 0; (c = getc(pipe)) != EOF;)
        output.text.push_back(static_cast<char>(c));
    const int status = pclose(pipe);
    output.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return output;
}

void set_interfaces(const std::vector<std::string> &names) {
    const auto wanted = [&](const std::string &name) {
        return std::find(names.begin(), names.end(), name) != names.end();
    };
    struct if_nameindex *const present = if_nameindex();
    ASSERT_NE(present, nullptr);
    for (const struct if_nameindex *entry = present; entry->if_name; ++entry)
        if (strcmp(entry->if_name, "lo") != 0 && !wanted(entry->if_name))
            unit::remove_interface(entry->if_name);
    if_freenameindex(present);
    for (const auto &name : names)
        if (if_nametoindex(name.c_str()) == 0)
            unit::add_interface(name.c_str());
}

// ---- /dev/log

static std::mutex log_mutex;
static std::condition_variable log_arrived;
// Never destroyed: the collector may be adding to it while the process exits.
static auto &log_datagrams = *new std::vector<std::string>;
static int log_marker = -1; // connected to the collector for good, even when /dev/log is unlinked

static const char marker[] = "end of what was logged so far";

static void collect(int receiver) {
    std::vector<char> buffer(1 << 21);
    for (;;) {
        const ssize_t length = recv(receiver, buffer.data(), buffer.size(), 0);
        const std::lock_guard lock(log_mutex);
        if (length >= 0)
            log_datagrams.emplace_back(buffer.data(), static_cast<size_t>(length));
        log_arrived.notify_all();
    }
}

static void start_log() {
    struct sockaddr_un address = {AF_UNIX, "/dev/log"};
    const auto *const name = reinterpret_cast<struct sockaddr *>(&address);
    unlink(address.sun_path);
    const int receiver = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    log_marker = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (bind(receiver, name, sizeof address) != 0 ||
        connect(log_marker, name, sizeof address) != 0) {
        perror("/dev/log");
        _exit(1);
    }
    std::thread(collect, receiver).detach();
}

std::vector<std::string> take_raw_log() {
    EXPECT_EQ(send(log_marker, marker, strlen(marker), 0), static_cast<ssize_t>(strlen(marker)));
    std::unique_lock lock(log_mutex);
    log_arrived.wait(lock, [] { return !log_datagrams.empty() && log_datagrams.back() == marker; });
    log_datagrams.pop_back();
    return std::exchange(log_datagrams, {});
}

// "<134>Jan  1 00:00:00 ident[pid]: [tid]: text" becomes "6 text".
static std::string plain(const std::string &datagram) {
    const long priority = strtol(datagram.c_str() + 1, nullptr, 10);
    size_t start = datagram.find("]: [");
    start = start == std::string::npos ? start : datagram.find("]: ", start + 4);
    EXPECT_NE(start, std::string::npos) << datagram;
    EXPECT_EQ(priority & ~7, LOG_LOCAL0) << datagram;
    return std::to_string(priority & 7) + " " +
           (start == std::string::npos ? datagram : datagram.substr(start + 3));
}

std::string take_log() {
    std::string log;
    for (const auto &datagram : take_raw_log())
        log += plain(datagram) + "\n";
    return log;
}

// ---- Waits

static std::vector<int64_t> waits;
static int nanosleep_failure_in;
static int nanosleep_error;

std::vector<int64_t> take_waits() {
    return std::exchange(waits, {});
}

void fail_nanosleep(int nth, int error) {
    nanosleep_failure_in = nth;
    nanosleep_error = error;
}

extern "C" unsigned int __wrap_sleep(unsigned int seconds) {
    waits.push_back(seconds * INT64_C(1000000000));
    errno = ECANCELED; // whoever reads errno after a sleep reads it too late
    return 0;
}

extern "C" int __wrap_nanosleep(const struct timespec *request, struct timespec * /*remaining*/) {
    waits.push_back(request->tv_sec * INT64_C(1000000000) + request->tv_nsec);
    if (nanosleep_failure_in == 0 || --nanosleep_failure_in > 0)
        return 0;
    errno = nanosleep_error;
    return -1;
}

// ---- Scripted surrogate parent

struct ScriptedSurrogate::State {
    std::string reply;
    Then then;
    std::string output;
    int listener;
    int stop;
    std::thread thread;
    std::mutex mutex;
    std::condition_variable idle;
    bool busy;
    std::string received;

    // Reads until `lines` line feeds came, or the end.
    bool await(int connection, long lines) {
        char bytes[4096];
        while (lines > 0) {
            struct pollfd waiting[] = {{connection, POLLIN, 0}, {stop, POLLIN, 0}};
            poll(waiting, 2, -1);
            const ssize_t length =
                waiting[1].revents ? 0 : recv(connection, bytes, sizeof bytes, 0);
            if (length <= 0)
                return false;
            lines -= std::count(bytes, bytes + length, '\n');
            const std::lock_guard lock(mutex);
            received.append(bytes, static_cast<size_t>(length));
        }
        return true;
    }

    static bool say(int connection, const std::string &text) {
        return send(connection, text.data(), text.size(), MSG_NOSIGNAL) > 0;
    }

    static void trickle(int connection, const std::string &text) {
        const int on = 1;
        setsockopt(connection, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
        if (text.size() > 100)
            say(connection, text);
        else
            for (const char c : text)
                say(connection, {c});
    }

    void converse(int connection) {
        if (then == Then::close_at_once || !await(connection, 2))
            return;
        while (say(connection, reply) && then == Then::flood)
            continue;
        if (then == Then::close || then == Then::flood)
            return;
        if (then != Then::hold) {
            if (!await(connection, 1))
                return;
            trickle(connection, output);
            if (then == Then::await_start)
                return;
            shutdown(connection, SHUT_WR);
        }
        while (await(connection, 1))
            continue;
    }

    void set_busy(bool value) {
        const std::lock_guard lock(mutex);
        busy = value;
        idle.notify_all();
    }

    void serve() {
        for (;;) {
            struct pollfd waiting[] = {{listener, POLLIN, 0}, {stop, POLLIN, 0}};
            poll(waiting, 2, -1);
            if (waiting[1].revents)
                return;
            set_busy(true);
            const int connection = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
            converse(connection);
            close(connection);
            set_busy(false);
        }
    }
};

ScriptedSurrogate::ScriptedSurrogate(std::string reply, Then then, std::string output)
    : state_(new State{std::move(reply),
                       then,
                       std::move(output),
                       socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0),
                       eventfd(0, EFD_CLOEXEC),
                       {},
                       {},
                       {},
                       false,
                       {}}) {
    const int on = 1;
    setsockopt(state_->listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    struct sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_port = htons(12865);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    EXPECT_EQ(bind(state_->listener, reinterpret_cast<struct sockaddr *>(&address), sizeof address),
              0);
    EXPECT_EQ(listen(state_->listener, 8), 0);
    state_->thread = std::thread(&State::serve, state_);
}

ScriptedSurrogate::~ScriptedSurrogate() {
    eventfd_write(state_->stop, 1);
    state_->thread.join();
    close(state_->listener);
    close(state_->stop);
    delete state_;
}

std::string ScriptedSurrogate::received() {
    std::unique_lock lock(state_->mutex);
    state_->idle.wait_for(lock, std::chrono::seconds(5), [this] { return !state_->busy; });
    return state_->received;
}

// ---- Fixture

static int descriptors_at_start;

void Unit::SetUp() {
    unit::make_unit_files("sy");
    ASSERT_EQ(vlsys_init(), 0);
    take_log();
    take_waits();
    descriptors_at_start = open_descriptors();
}

void Unit::TearDown() {
    vlsys_exit();
    EXPECT_LE(open_descriptors(), descriptors_at_start) << "descriptors left open";
}

} // namespace test

int main(int argc, char **argv) {
    const bool only_listing = std::any_of(argv, argv + argc, [](const char *argument) {
        return strcmp(argument, "--gtest_list_tests") == 0;
    });
    testing::InitGoogleTest(&argc, argv);
    if (!only_listing) {
        unit::enter_namespaces();
        test::start_log();
    }
    return RUN_ALL_TESTS();
}
