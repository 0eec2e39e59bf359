#include "fixture.h"

#include "standin/log.h"
#include "standin/loopback.h"
#include "vlsys.h"

#include <algorithm>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <fts.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <numeric>
#include <poll.h>
#include <set>
#include <sstream>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace test {

std::string read_file(const std::string &path) {
    const std::ifstream file(path);
    EXPECT_TRUE(file) << "cannot read " << path;
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
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
    char target[4096];
    const ssize_t length = readlink(path.c_str(), target, sizeof target);
    return {target, static_cast<size_t>(std::max<ssize_t>(length, 0))};
}

// ---- What changed

static std::string describe(const fs::path &path) {
    if (fs::is_symlink(path))
        return "-> " + link_target(path) + "\n";
    char mode[] = "mode 0000\n";
    snprintf(mode, sizeof mode, "mode %04o\n", mode_of(path) & 07777);
    return (mode_of(path) == 0644 ? "" : mode) + read_file(path);
}

Files unit_files(const std::string &directory) {
    Files files;
    std::string root = directory;
    char *const roots[] = {root.data(), nullptr};
    FTS *const walk = fts_open(roots, FTS_PHYSICAL | FTS_NOCHDIR, nullptr);
    while (const FTSENT *entry = fts_read(walk)) {
        const bool is_link = entry->fts_info == FTS_SL || entry->fts_info == FTS_SLNONE;
        const bool is_machines = is_link && link_target(entry->fts_path).starts_with("/run/host/");
        if ((is_link || entry->fts_info == FTS_F) && !is_machines)
            files[entry->fts_path + root.size() + 1] = describe(entry->fts_path);
    }
    fts_close(walk);
    return files;
}

static std::vector<std::string> split_lines(const std::string &text) {
    std::istringstream stream(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

static std::string key_of(const std::string &line) {
    const std::string key = line.substr(0, line.find('='));
    return key.substr(0, key.find_last_not_of(' ') + 1);
}

static std::string changed_lines(const std::string &before, const std::string &after) {
    const std::vector<std::string> old_lines = split_lines(before);
    const std::set<std::string> known(old_lines.begin(), old_lines.end());
    std::set<std::string> keys;
    std::string changed;
    for (const auto &line : split_lines(after)) {
        keys.insert(key_of(line));
        if (!known.contains(line))
            changed += "+" + line + "\n";
    }
    for (const auto &line : old_lines)
        if (!line.empty() && line[0] != '#' && !keys.contains(key_of(line)))
            changed += "-" + key_of(line) + "\n";
    return changed;
}

std::string changes(const Files &before, const Files &after) {
    Files all = before;
    all.insert(after.begin(), after.end());
    std::string changed;
    for (const auto &[path, text] : all) {
        const std::string name = fs::path(path).filename();
        if (!after.contains(path))
            changed += "-" + name + "\n";
        else if (!before.contains(path))
            changed += "+" + name + "\n" + changed_lines("", text);
        else if (const auto lines = changed_lines(before.at(path), after.at(path)); !lines.empty())
            changed += name + "\n" + lines;
    }
    return changed;
}

// ---- This process

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

static std::vector<unit::LogMessage> parse(const std::vector<std::string> &datagrams) {
    std::vector<unit::LogMessage> messages;
    for (const auto &datagram : datagrams) {
        unit::LogMessage message = unit::parse_log_datagram(datagram);
        EXPECT_EQ(message.priority & ~LOG_PRIMASK, LOG_LOCAL0) << datagram;
        EXPECT_NE(message.text, datagram) << "has not the form of a message";
        message.priority = LOG_PRI(message.priority);
        messages.push_back(message);
    }
    return messages;
}

std::string take_log() {
    std::string log;
    for (const auto &message : parse(take_raw_log()))
        log += std::to_string(message.priority) + " " + message.text + "\n";
    return log;
}

std::string take_log(int priority) {
    std::string log;
    for (const auto &message : parse(take_raw_log()))
        if (message.priority <= priority)
            log += message.text + "\n";
    return log;
}

testing::AssertionResult logged(int priority, const std::string &text) {
    const std::lock_guard lock(log_mutex);
    drain();
    testing::AssertionResult missing = testing::AssertionFailure();
    missing << "not logged: " << priority << " " << text << "\nbut:\n";
    for (const auto &message : parse(log_datagrams)) {
        if (message.priority == priority && message.text == text)
            return testing::AssertionSuccess();
        missing << message.priority << " " << message.text << "\n";
    }
    return missing;
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
