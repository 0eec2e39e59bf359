#include "fixture.h"

#include "standin/log.h"
#include "standin/loopback.h"
#include "vlsys.h"

#include <algorithm>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <numeric>
#include <poll.h>
#include <set>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace test {

std::string read_file(const std::string &path) {
    std::ifstream file(path);
    EXPECT_TRUE(file) << "cannot read " << path;
    return {std::istreambuf_iterator<char>(file), {}};
}

void write_file(const std::string &path, const std::string &content) {
    EXPECT_TRUE((std::ofstream(path) << content).flush()) << "cannot write " << path;
}

std::string list_directory(const std::string &path) {
    std::set<std::string> names;
    for (const auto &entry : fs::directory_iterator(path))
        names.insert(entry.path().filename().string() + "\n");
    return std::accumulate(names.begin(), names.end(), std::string());
}

unsigned mode_of(const std::string &path) {
    return static_cast<unsigned>(fs::symlink_status(path).permissions());
}

std::string link_target(const std::string &path) {
    std::error_code error;
    return fs::read_symlink(path, error);
}

int open_descriptors() {
    return static_cast<int>(std::distance(fs::directory_iterator("/proc/self/fd"), {}));
}

long peak_memory() {
    struct rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
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

// ---- /dev/log

static int log_receiver;
static std::mutex log_mutex;
// Never destroyed: the collector may be adding to it while the process exits.
static auto &log_datagrams = *new std::vector<std::string>;

static void drain() {
    for (std::string datagram; unit::take_log_datagram(log_receiver, &datagram);)
        log_datagrams.push_back(datagram);
}

// The socket holds little: whoever logs should not have to wait for the test to take it.
static void collect() {
    for (struct pollfd ready = {log_receiver, POLLIN, 0};;) {
        poll(&ready, 1, -1);
        const std::lock_guard lock(log_mutex);
        drain();
    }
}

std::vector<std::string> take_raw_log() {
    const std::lock_guard lock(log_mutex);
    drain(); // what was sent before is there
    return std::exchange(log_datagrams, {});
}

std::string take_log() {
    std::string log;
    for (const auto &datagram : take_raw_log()) {
        const unit::LogMessage message = unit::parse_log_datagram(datagram);
        EXPECT_EQ(message.priority & ~7, LOG_LOCAL0) << datagram;
        EXPECT_NE(message.text, datagram);
        log += std::to_string(message.priority & 7) + " " + message.text + "\n";
    }
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

// Reads until `lines` line feeds came, or the end.
bool ScriptedSurrogate::await(int connection, long lines) {
    char bytes[4096];
    while (lines > 0) {
        const ssize_t length = recv(connection, bytes, sizeof bytes, 0);
        if (length <= 0)
            return false;
        lines -= std::count(bytes, bytes + length, '\n');
        received_.append(bytes, static_cast<size_t>(length));
    }
    return true;
}

static void trickle(int connection, const std::string &text) {
    const int on = 1;
    setsockopt(connection, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    if (text.size() > 100)
        unit::say(connection, text);
    else
        for (const char c : text)
            unit::say(connection, {c});
}

void ScriptedSurrogate::converse(int connection) {
    if (!await(connection, 2))
        return;
    while (unit::say(connection, reply_) && then_ == Then::flood)
        continue;
    if (then_ == Then::close || then_ == Then::flood)
        return;
    if (then_ != Then::hold) {
        if (!await(connection, 1))
            return;
        trickle(connection, output_);
        if (then_ == Then::await_start)
            return;
        shutdown(connection, SHUT_WR);
    }
    while (await(connection, 1))
        continue;
}

void ScriptedSurrogate::serve() {
    sigset_t all; // signals are for the test's own thread
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, nullptr);
    const struct timeval patience = {5, 0}; // with a client that never closes
    for (int connection; (connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;) {
        const std::lock_guard lock(mutex_);
        setsockopt(connection, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
        converse(connection);
        close(connection);
    }
}

ScriptedSurrogate::ScriptedSurrogate(std::string reply, Then then, std::string output)
    : reply_(std::move(reply)), then_(then), output_(std::move(output)),
      listener_(unit::listen_on_loopback()), thread_(&ScriptedSurrogate::serve, this) {}

ScriptedSurrogate::~ScriptedSurrogate() {
    shutdown(listener_, SHUT_RD); // ends the thread's accept
    thread_.join();
    close(listener_);
}

std::string ScriptedSurrogate::received() {
    const std::lock_guard lock(mutex_);
    return received_;
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
    testing::InitGoogleTest(&argc, argv);
    if (!GTEST_FLAG_GET(list_tests)) {
        unit::enter_namespaces();
        test::log_receiver = unit::open_log();
        std::thread(test::collect).detach();
    }
    return RUN_ALL_TESTS();
}
