// What the tests share: files, the captured log, counted waits, a scripted surrogate parent.
// Every test process runs in namespaces of its own with the stand-in unit's files and interfaces;
// /run is the place for files of a test's own (see standin/sandbox.h for what else can be written).
#pragma once

#include "standin/sandbox.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <mutex>
#include <string>
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
// The datagrams as they came.
std::vector<std::string> take_raw_log();

// sleep and nanosleep are counted, not sat through: one entry per call, in nanoseconds.
std::vector<int64_t> take_waits();
// What the n-th call from now (1 is the next) of nanosleep returns: -1 with this errno.
void fail_nanosleep(int nth, int error);

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
