// What the tests share: files and what changed in them, the log, counted waits, calls that fail, a
// scripted surrogate parent.
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

struct Output {
    std::string text;
    int status; // exit status; -1 when it did not exit
};
// Runs a shell command, whose standard output it takes.
Output capture(const std::string &command);

std::string read_file(const std::string &path);
void write_file(const std::string &path, const std::string &content);
// The names in a directory, sorted, one per line.
std::string list_directory(const std::string &path);
// Permission bits of a path (not following a link).
unsigned mode_of(const std::string &path);
std::string link_target(const std::string &path);
// The files below a directory by their paths in it, links to the machine's own aside. A link's text
// is "-> <target>"; a mode other than 0644 is told in the first line.
using Files = std::map<std::string, std::string>;
Files unit_files(const std::string &directory = "/etc");
// What became of the files of a snapshot, file by file, in the order of their paths:
//   ifcfg-eth0     changed ("+ifcfg-eth0": new, "-ifcfg-eth0": gone)
//   +ONBOOT=no     a line that was not there before, in the order of the file
//   -IPADDR        a key, the part before the "=", that is gone; comments aside
std::string changes(const Files &before, const Files &after = unit_files());

int open_descriptors();

// What was sent to /dev/log since the last call: one line per message, "<priority> <text>\n",
// without time, identity, process and thread id: "6 hostname: vl\n".
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
// this thread. Calls are known by the table in faults.cpp, and "nanosleep".
void fail_call(const std::string &name, int nth, int error);

// A surrogate parent on 127.0.0.1:12865: it takes one connection after the other; for each it waits
// for the request's two lines, sends `reply`, then does what `then` says.
class ScriptedSurrogate {
  public:
    enum class Then {
        close,       // close the connection
        await_start, // wait for "start\n", send `output`, close
        await_kill   // wait for "start\n", send `output` and the end, wait for "kill\n"
    };
    ScriptedSurrogate(std::string reply, Then then, std::string output = "");
    ~ScriptedSurrogate();
    std::string received(); // over all connections so far

  private:
    void serve();
    void await(int connection, int lines);

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
