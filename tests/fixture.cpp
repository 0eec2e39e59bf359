#include "fixture.h"

#include "standin/log.h"
#include "standin/loopback.h"
#include "vlsys.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <poll.h>
#include <set>
#include <sstream>
#include <sys/socket.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace test {

Output capture(const std::string &command) {
    FILE *const pipe = popen(command.c_str(), "r");
    Output output;
    for (int c = 0; (c = getc(pipe)) != EOF;)
        output.text.push_back(static_cast<char>(c));
    const int status = pclose(pipe);
    output.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return output;
}

std::string read_file(const std::string &path) {
    const std::ifstream file(path);
    EXPECT_TRUE(file.is_open()) << "cannot read " << path;
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

void write_file(const std::string &path, const std::string &content) {
    EXPECT_TRUE((std::ofstream(path) << content).flush()) << "cannot write " << path;
}

std::string list_directory(const std::string &path) {
    return capture("ls -A " + path).text;
}

unsigned mode_of(const std::string &path) {
    return static_cast<unsigned>(fs::symlink_status(path).permissions());
}

std::string link_target(const std::string &path) {
    std::error_code error;
    return fs::read_symlink(path, error);
}

static std::string describe(const fs::path &path) {
    if (fs::is_symlink(path))
        return "-> " + link_target(path) + "\n";
    return (mode_of(path) == 0644 ? "" : "its mode is not 0644\n") + read_file(path);
}

Files unit_files(const std::string &directory) {
    Files files;
    for (const auto &entry : fs::recursive_directory_iterator(directory)) {
        const bool is_link = entry.is_symlink();
        const bool is_machines = is_link && link_target(entry.path()).starts_with("/run/host/");
        if (!is_machines && (is_link || !entry.is_directory()))
            files[entry.path().lexically_relative(directory)] = describe(entry.path());
    }
    return files;
}

static std::vector<std::string> lines_of(const std::string &text) {
    std::istringstream stream(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

static std::string changed_lines(const std::string &before, const std::string &after) {
    const std::vector<std::string> old_lines = lines_of(before);
    std::set<std::string> keys;
    std::string changed;
    for (const auto &line : lines_of(after)) {
        keys.insert(line.substr(0, line.find('=')));
        if (std::find(old_lines.begin(), old_lines.end(), line) == old_lines.end())
            changed += "+" + line + "\n";
    }
    for (const auto &line : old_lines) {
        const std::string key = line.substr(0, line.find('='));
        if (!key.empty() && key[0] != '#' && !keys.contains(key))
            changed += "-" + key + "\n";
    }
    return changed;
}

std::string changes(const Files &before, const Files &after) {
    Files all = before;
    all.insert(after.begin(), after.end());
    std::string changed;
    for (const auto &[path, text] : all) {
        const std::string name = fs::path(path).filename();
        if (!after.contains(path))
            changed.append("-").append(name).append("\n");
        else if (!before.contains(path))
            changed.append("+").append(name).append("\n").append(changed_lines("", text));
        else if (const auto lines = changed_lines(before.at(path), after.at(path)); !lines.empty())
            changed.append(name).append("\n").append(lines);
    }
    return changed;
}

int open_descriptors() {
    return static_cast<int>(std::distance(fs::directory_iterator("/proc/self/fd"), {}));
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

static std::string log_of(const std::vector<std::string> &datagrams) {
    std::string log;
    for (const auto &datagram : datagrams) {
        const unit::LogMessage message = unit::parse_log_datagram(datagram);
        log += std::to_string(LOG_PRI(message.priority)) + " " + message.text + "\n";
    }
    return log;
}

std::string take_log() {
    return log_of(take_raw_log());
}

std::string take_log(int priority) {
    std::string log;
    for (const auto &datagram : take_raw_log()) {
        const unit::LogMessage message = unit::parse_log_datagram(datagram);
        if (LOG_PRI(message.priority) <= priority)
            log += message.text + "\n";
    }
    return log;
}

testing::AssertionResult logged(int priority, const std::string &text) {
    const std::lock_guard lock(log_mutex);
    drain();
    const std::string log = "\n" + log_of(log_datagrams);
    const std::string line = "\n" + std::to_string(priority) + " " + text + "\n";
    return testing::AssertionResult(log.find(line) != std::string::npos)
           << "not" << line << "but" << log;
}

// ---- Scripted surrogate parent

// Reads until `lines` line feeds came, or the end.
void ScriptedSurrogate::await(int connection, int lines) {
    for (char c = 0; lines > 0 && recv(connection, &c, 1, 0) == 1; lines -= c == '\n')
        received_ += c;
}

// To a client that is gone it says the rest in vain.
void ScriptedSurrogate::serve() {
    for (int connection; (connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;) {
        const std::lock_guard lock(mutex_);
        await(connection, 2);
        unit::say(connection, reply_);
        if (then_ != Then::close) {
            await(connection, 1);
            unit::say(connection, output_);
        }
        if (then_ == Then::await_kill) {
            shutdown(connection, SHUT_WR);
            await(connection, 1);
        }
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
