#include "fixture.h"

#include "core/owners.h"
#include "standin/log.h"
#include "standin/loopback.h"
#include "vlsys.h"

#include <algorithm>
#include <climits>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <poll.h>
#include <set>
#include <sstream>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

namespace fs = std::filesystem;

namespace test {

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

static std::string content_of(const fs::path &path) {
    if (fs::is_symlink(path))
        return "link to " + fs::read_symlink(path).string() + "\n";
    const bool is_0644 = fs::status(path).permissions() == fs::perms{0644};
    return (is_0644 ? "" : "its mode is not 0644\n") + read_file(path);
}

static bool is_link_to_machine(const fs::path &path) {
    return fs::is_symlink(path) && fs::read_symlink(path).string().starts_with("/run/host/");
}

Files unit_files(const std::string &directory) {
    Files files;
    for (const auto &entry : fs::recursive_directory_iterator(directory)) {
        const bool is_directory = fs::is_directory(entry.symlink_status());
        if (!is_directory && !is_link_to_machine(entry))
            files[entry.path().lexically_relative(directory)] = content_of(entry);
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
            changed += "+" + line + " ";
    }
    for (const auto &line : old_lines) {
        const std::string key = line.substr(0, line.find('='));
        if (!key.empty() && key[0] != '#' && !keys.contains(key))
            changed += "-" + key + " ";
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
            changed.append("-").append(name).append(" ");
        else if (!before.contains(path))
            changed.append("+").append(name).append(" ").append(changed_lines("", text));
        else if (const auto lines = changed_lines(before.at(path), after.at(path)); !lines.empty())
            changed.append(name).append(" ").append(lines);
    }
    return changed;
}

static int log_receiver;
static std::mutex log_mutex;
// Never destroyed: the collector may be adding to it while the process exits.
static auto &log_datagrams = *new std::vector<std::string>;

static void drain() {
    for (std::string datagram; unit::take_log_datagram(log_receiver, &datagram);)
        log_datagrams.push_back(datagram);
}

// The socket holds few messages. It is emptied all the time, so that nobody who logs has to wait.
static void collect() {
    struct pollfd ready = {log_receiver, POLLIN, 0};
    for (;;) {
        poll(&ready, 1, -1);
        const std::lock_guard lock(log_mutex);
        drain();
    }
}

std::vector<std::string> take_raw_log() {
    const std::lock_guard lock(log_mutex);
    drain(); // the collector may not have come to it yet
    return std::exchange(log_datagrams, {});
}

std::string take_log(int priority) {
    std::string log;
    for (const auto &datagram : take_raw_log()) {
        const unit::LogMessage message = unit::parse_log_datagram(datagram);
        if (const int level = LOG_PRI(message.priority); level <= priority)
            log += std::to_string(level) + " " + message.text + "\n";
    }
    return log;
}

static std::string receive(int connection, int lines) {
    std::string text;
    char c = 0;
    while (lines > 0 && recv(connection, &c, 1, 0) == 1) {
        text += c;
        lines -= c == '\n' ? 1 : 0;
    }
    return text;
}

std::future<std::string> answer(const std::string &reply, const std::string &output) {
    const int listener = unit::listen_on_loopback();
    return std::async(std::launch::async, [=] {
        const vlsys::Fd connection(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC));
        close(listener);
        std::string received = receive(connection.get(), 2);
        unit::say(connection.get(), reply);
        if (!output.empty()) {
            received += receive(connection.get(), 1);
            unit::say(connection.get(), output);
        }
        shutdown(connection.get(), SHUT_WR);
        return received + receive(connection.get(), INT_MAX);
    });
}

void Unit::SetUp() {
    unit::make_unit_files("sy");
    set_interfaces({"eth0", "eth1"});
    ASSERT_EQ(vlsys_init(), 0);
    take_log();
    take_waits();
}

void Unit::TearDown() {
    vlsys_exit();
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
