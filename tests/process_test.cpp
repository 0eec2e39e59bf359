// Commands, run directly and by the surrogate parent.
#include "fixture.h"
#include "vlsys.h"

#include <climits>
#include <csignal>
#include <cstring>
#include <sys/wait.h>

using namespace test;
using Then = ScriptedSurrogate::Then;

using Process = Unit;

TEST_F(Process, AStatusTextSaysHowTheCommandEnded) {
    char text[64] = "";
    EXPECT_EQ(vlsys_exit_status_text(text, sizeof text, 812, nullptr, 0xff00), 255);
    EXPECT_STREQ(text, "exited pid: 812 (?), status: 255");
    EXPECT_EQ(vlsys_exit_status_text(text, sizeof text, 0, "x", SIGKILL), 256);
    EXPECT_STREQ(text, "exited (x), abnormally, signaled: 9");
}

TEST_F(Process, ADirectStartLeavesTheSignalsAlone) {
    sigset_t mask = {};
    sigaddset(&mask, SIGUSR1);
    sigprocmask(SIG_SETMASK, &mask, nullptr);
    const std::map<const char *, int> statuses = {
        {"kill -INT $$; :", SIGINT},
        {"kill -QUIT $$; :", SIGQUIT},
        {"exec grep -q 'SigBlk:.0*200$' /proc/self/status", 0},
    };
    for (const auto &[command, expected] : statuses) {
        int status = 0;
        take_raw_log();
        waitpid(vlsys_spawn_direct(command), &status, 0);
        EXPECT_EQ(status & ~WCOREFLAG, expected) << command;
        EXPECT_EQ(signal(SIGINT, SIG_DFL), SIG_DFL) << command;
        EXPECT_EQ(signal(SIGQUIT, SIG_DFL), SIG_DFL) << command;
        EXPECT_EQ(take_raw_log().size(), 2U) << "the child logs nothing";
    }
}

TEST_F(Process, AReplyIsOneNumber) {
    const struct {
        std::string reply;
        int result;
        int error;
    } rows[] = {
        {"256\n", 256, 0},     {"-1\n", -1, EPROTO}, {"2147483648\n", INT_MAX, 0},
        {"12a\n", -1, EPROTO}, {"\n", -1, EPROTO},   {"", -1, ECONNRESET},
    };
    ASSERT_EQ(chdir("/run"), 0);
    for (const auto &row : rows) {
        ScriptedSurrogate surrogate(row.reply, Then::close);
        errno = 0;
        EXPECT_EQ(vlsys_system("a b"), row.result) << row.reply;
        EXPECT_EQ(errno, row.error) << row.reply;
        errno = 0;
        EXPECT_EQ(vlsys_spawn("a b"), row.result) << row.reply;
        EXPECT_EQ(errno, row.error) << row.reply;
        EXPECT_EQ(surrogate.received(), "/run\na b\n/run\na b &\n");
    }
}

TEST_F(Process, APipeReadIsStartedReadAndKilled) {
    const std::string longest(1023 - strlen("/\n |\n"), 'x');
    ASSERT_EQ(chdir("/"), 0);
    ScriptedSurrogate surrogate("\n4711\n", Then::await_kill, "out\n256\n");
    EXPECT_EQ(vlsys_popen((longest + "x").c_str()), nullptr);
    EXPECT_EQ(errno, E2BIG);
    FILE *const stream = vlsys_popen(longest.c_str());
    EXPECT_EQ(getc(stream), 'o');
    fail_call("nanosleep", 1, EINTR);
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_EQ(take_waits(), (std::vector<int64_t>{second, 1})) << "it sleeps on after a signal";
    EXPECT_EQ(surrogate.received(), "/\n" + longest + " |\nstart\nkill\n");
}

TEST_F(Process, WhatIsNoCommandIsNotSent) {
    run("mkdir '/run/a\ntouch pwned; #'");
    ScriptedSurrogate surrogate("0\n", Then::close);
    EXPECT_EQ(vlsys_system(nullptr), -1);
    EXPECT_EQ(vlsys_spawn(nullptr), -1);
    EXPECT_EQ(vlsys_popen(nullptr), nullptr);
    EXPECT_EQ(vlsys_spawn_direct(nullptr), -1);
    EXPECT_EQ(vlsys_system("a\nb"), -1);
    EXPECT_EQ(errno, EINVAL);
    ASSERT_EQ(chdir("/run/a\ntouch pwned; #"), 0);
    EXPECT_EQ(vlsys_popen("a"), nullptr);
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(surrogate.received(), "");
}

TEST_F(Process, CommandsRunDirectlyWithoutASurrogateParent) {
    EXPECT_EQ(vlsys_surrogate_connect(1, VLSYS_SURROGATE_PORT), 0) << "not logged when quiet";
    EXPECT_EQ(vlsys_system("exit 3"), 3 << 8);
    EXPECT_EQ(take_log(), "3 connect: Connection refused\n"
                          "4 can't connect surrogate parant. fallback to direct call.\n");
}
