// What the tests share. They run in namespaces of their own, with the stand-in unit's files and
// interfaces, and may write into /run (standin/sandbox.h says where else).
#pragma once

#include "standin/sandbox.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <future>
#include <map>
#include <string>
#include <syslog.h>
#include <vector>

namespace test {

using unit::run;
using unit::set_interfaces;

std::string read_file(const std::string &path);
void write_file(const std::string &path, const std::string &content);
inline const std::string ifcfg = "/etc/sysconfig/network-scripts/ifcfg-";

// The content of each file by its path below a directory, without links to the machine's own files.
// That of a link is "link to <target>"; a line before it says when the mode is not 0644.
using Files = std::map<std::string, std::string>;
Files unit_files(const std::string &directory = "/etc");
// What became of the files since a snapshot: "ifcfg-eth0 +ONBOOT=no -IPADDR " says that this file
// has a new line "ONBOOT=no", and no line any more that begins with "IPADDR=" (comments that go are
// not shown). "+" before a file's name: the file is new; "-": it is gone.
std::string changes(const Files &before, const Files &after = unit_files());

// Takes what was sent to /dev/log since it was last taken, and gives the messages of this priority
// and of more urgent ones. Each is a line of priority and text: "6 hostname: vl\n".
std::string take_log(int priority = LOG_DEBUG);
// Takes the log as the datagrams that came.
std::vector<std::string> take_raw_log();

// sleep and nanosleep are counted, not sat through: one entry per call, in nanoseconds.
inline constexpr int64_t second = 1000000000;
std::vector<int64_t> take_waits();
// The next nanosleep ends one nanosecond early, as when a signal comes.
void interrupt_next_wait();

// A surrogate parent for one request, on 127.0.0.1:12865: it waits for the request's two lines and
// sends `reply`. When there is `output` (a pipe read) it then waits for "start\n" and sends that.
// Gives all that the client sent, once the client has closed the connection.
std::future<std::string> answer(const std::string &reply, const std::string &output = "");

// The "sy" unit's files, eth0 and eth1 are there, the library is started, the log is empty.
class Unit : public ::testing::Test {
  protected:
    void SetUp() override;
    void TearDown() override; // calls vlsys_exit
};

} // namespace test
