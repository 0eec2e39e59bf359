#include "fixture.h"
#include "vlsys.h"

#include <climits>
#include <csignal>
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace test;

using Process = Unit;

TEST_F(Process, AStatusTextSaysHowTheCommandEnded) {
    char text[64] = "";
    EXPECT_EQ(vlsys_exit_status_text(text, sizeof text, 812, nullptr, 0xff00), 255);
    EXPECT_STREQ(text, "exited pid: 812 (?), status: 255");
    EXPECT_EQ(vlsys_exit_status_text(text, sizeof text, 0, "x", SIGKILL), 256);
    EXPECT_STREQ(text, "exited (x), abnormally, signaled: 9");
}

TEST_F(Process, ADirectStartLeavesTheSignalsAlone) {
    signal(SIGINT, _exit);
    // Prints the blocked and the ignored signals from 1 to 28; libc uses some of the higher ones.
    const std::string signals =
        "sed -En 's/^(SigBlk|SigIgn).*(.{7})$/\\1 \\2/p' /proc/self/status >/run/";
    const std::string command = signals + "child";
    const pid_t child = vlsys_spawn_direct(command.c_str());
    waitpid(child, nullptr, 0);
    EXPECT_EQ(take_log(), "7 CMD: " + command + "\n7 pid: " + std::to_string(child) + "\n");
    run(signals + "expected");
    EXPECT_EQ(read_file("/run/child"), read_file("/run/expected"));
    EXPECT_EQ(signal(SIGINT, SIG_DFL), _exit);
    EXPECT_EQ(signal(SIGQUIT, SIG_DFL), SIG_DFL);
    sigset_t mask;
    sigprocmask(SIG_BLOCK, nullptr, &mask);
    EXPECT_FALSE(sigismember(&mask, SIGCHLD));
}

TEST_F(Process, AReplyIsOneNumber) {
    const struct {
        const char *why, *reply;
        int result, error;
    } rows[] = {
        {"zero", "0\n", 0, 0},
        {"a number above int's", "2147483648\n", INT_MAX, 0},
        {"a number below zero", "-1\n", -1, EPROTO},
        {"more than a number", "12a\n", -1, EPROTO},
        {"no reply", "", -1, ECONNRESET},
    };
    for (const auto &row : rows) {
        const auto request = answer(row.reply);
        errno = 0;
        EXPECT_EQ(vlsys_system("a b"), row.result) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
    }
    const auto request = answer("");
    EXPECT_EQ(vlsys_popen("a b"), nullptr);
    EXPECT_EQ(errno, ECONNRESET);
}

TEST_F(Process, ACommandIsSentWithTheWorkingDirectory) {
    ASSERT_EQ(chdir("/run"), 0);
    auto request = answer("256\n");
    EXPECT_EQ(vlsys_system("a b"), 256);
    EXPECT_EQ(request.get(), "/run\na b\n");
    request = answer("256\n");
    EXPECT_EQ(vlsys_spawn("a b"), 256);
    EXPECT_EQ(request.get(), "/run\na b &\n");
    EXPECT_EQ(take_log(), "7 CWD: /run\n6 CMD: a b\n7 \"a b\" returned 1\n"
                          "7 CWD: /run\n6 CMD: a b\n7 received 256\n\n7 \"a b\" pid: 256\n");
}

TEST_F(Process, APipeReadIsStartedReadAndKilled) {
    const std::string longest(1018, 'x'); // with "/" the 1019 bytes that are allowed
    ASSERT_EQ(chdir("/"), 0);
    auto request = answer("\n4711\n", "out\n256\n");
    FILE *const stream = vlsys_popen(longest.c_str());
    EXPECT_EQ(take_log(LOG_INFO), "6 pid: 4711\n");
    EXPECT_EQ(fcntl(fileno(stream), F_GETFD), FD_CLOEXEC) << "commands inherit nothing";
    EXPECT_EQ(getc(stream), 'o');
    interrupt_next_wait();
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_EQ(take_waits(), (std::vector<int64_t>{second, 1})) << "it goes on after a signal";
    EXPECT_EQ(request.get(), "/\n" + longest + " |\nstart\nkill\n");
}

TEST_F(Process, WhatIsNoRequestIsNotSent) {
    EXPECT_EQ(vlsys_system(nullptr), -1);
    EXPECT_EQ(vlsys_popen(nullptr), nullptr);
    EXPECT_EQ(vlsys_spawn_direct(nullptr), -1);
    auto request = answer("0\n");
    EXPECT_EQ(vlsys_system("a\nb"), -1);
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(request.get(), "");
    request = answer("0\n");
    ASSERT_EQ(chdir("/"), 0);
    EXPECT_EQ(vlsys_popen(std::string(1019, 'x').c_str()), nullptr) << "too long";
    EXPECT_EQ(errno, E2BIG);
    EXPECT_EQ(request.get(), "");
    run("mkdir '/run/a\ntouch pwned; #'");
    ASSERT_EQ(chdir("/run/a\ntouch pwned; #"), 0);
    request = answer("0\n");
    EXPECT_EQ(vlsys_popen("a"), nullptr);
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(request.get(), "");
}
