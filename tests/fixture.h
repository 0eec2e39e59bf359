// What the tests share: files and what changed in them, the captured log, counted waits, calls that
// fail, a scripted surrogate parent.
// Every test process runs in namespaces of its own with the stand-in unit's files and interfaces;
// /run is the place for files of a test's own (see standin/sandbox.h for what else can be written).
#pragma once

#include "standin/sandbox.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <syslog.h>
#include <thread>
#include <vector>

namespace test {

using unit::run;
using unit::set_interfaces;

std::string read_file(const std::string &path);
void write_file(const std::string &path, const std::string &content);
// The names in a directory, sorted, one per line.
std::string list_directory(const std::string &path);
// Permission bits of a path (not following a link).
unsigned mode_of(const std::string &path);
std::string link_target(const std::string &path);
// The files below a directory by their paths in it, links to the machine's own aside. A link's text
// is "-> <target>"; a mode other than 0644 is the first line, "mode 0600".
using Files = std::map<std::string, std::string>;
Files unit_files(const std::string &directory = "/etc");
// What became of the files of a snapshot, file by file, in the order of their paths:
//   ifcfg-eth0     changed ("+ifcfg-eth0": new, "-ifcfg-eth0": gone, and no lines follow)
//   +ONBOOT=no     a line that was not there before, in the order of the file
//   -IPADDR        what stood before the "=" in a line that has no successor; comments aside
std::string changes(const Files &before, const Files &after = unit_files());

int open_descriptors();
long peak_memory(); // in KiB
struct Output {
    std::string text;
    int status; // exit status; -1 when it did not exit
};
// Runs a shell command, whose standard output it takes.
Output capture(const std::string &command);

// What was sent to /dev/log since the last call: one line per message, "<priority> <text>\n",
// without time, identity, process and thread id: "6 hostname: vl\n". A line feed inside a text
// stays.
std::string take_log();
// The texts of those of this priority or a more urgent one, a line each: take_log(LOG_WARNING).
std::string take_log(int priority);
// Whether one of the messages that were not yet taken has this priority and text; takes none.
testing::AssertionResult logged(int priority, const std::string &text);
// The datagrams as they came.
std::vector<std::string> take_raw_log();

// sleep and nanosleep are counted, not sat through: one entry per call, in nanoseconds.
inline constexpr int64_t second = 1000000000;
std::vector<int64_t> take_waits();

// The library's nth call of this name from now on (1 is the next) fails with this errno, once, on
// this thread. getaddrinfo and getnameinfo return EAI_SYSTEM with it, or a resolver code itself.
// Calls are known by the table in faults.cpp, and "nanosleep". A later one replaces this.
void fail_call(const std::string &name, int nth, int error);
// Acts right before the library's next call of this name.
void before_call(const std::string &name, void (*act)());

// A surrogate parent on 127.0.0.1:12865 that plays a script, on a thread of its own: it takes one
// connection after the other; for each it waits for the request (up to its line feed-ended last
// line), sends `reply`, then does what `then` says; a short `output` goes out byte by byte.
// `received()` is all that came over all connections so far.
class ScriptedSurrogate {
  public:
    enum class Then {
        close,       // close the connection
        hold,        // keep it open until the client closes
        await_start, // wait for "start\n", send `output`, close
        await_kill,  // wait for "start\n", send `output`, then for "kill\n" or the client's close
        flood        // send `reply` over and over until the client closes
    };
    ScriptedSurrogate(std::string reply, Then then, std::string output = "");
    ~ScriptedSurrogate();
    std::string received();

  private:
    void serve();
    void converse(int connection);
    bool await(int connection, long lines);

    std::string reply_;
    Then then_;
    std::string output_;
    int listener_;
    std::mutex mutex_; // held through a conversation
    std::string received_;
    std::thread thread_;
};

// The files of the "sy" unit in place, its interfaces not (see set_interfaces), the library started
// and the log emptied.
class Unit : public ::testing::Test {
  protected:
    void SetUp() override;
    void TearDown() override; // vlsys_exit; the test fails when descriptors are left open
};

} // namespace test
