// Commands, run directly and by the surrogate parent.
#include "fixture.h"
#include "vlsys.h"

#include <climits>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/wait.h>

using namespace test;
using Then = ScriptedSurrogate::Then;

class Process : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        ASSERT_EQ(chdir("/run"), 0);
    }
};

TEST_F(Process, AStatusTextSaysHowTheCommandEnded) {
    const struct {
        const char *why;
        pid_t pid;
        const char *name;
        int status, result;
        const char *text;
    } rows[] = {
        {"it exited", 0, "x", 0, 0, "exited (x), status: 0"},
        {"the command is not known", 812, nullptr, 0xff00, 255, "exited pid: 812 (?), status: 255"},
        {"a signal ended it", 0, "x", SIGKILL, 256, "exited (x), abnormally, signaled: 9"},
        {"it was stopped", 0, "x", 0x137f, 256, "exited (x), abnormally"},
    };
    for (const auto &row : rows) {
        char text[64] = "";
        EXPECT_EQ(vlsys_exit_status_text(text, sizeof text, row.pid, row.name, row.status),
                  row.result)
            << row.why;
        EXPECT_STREQ(text, row.text) << row.why;
    }
}

TEST_F(Process, ADirectStartLeavesTheSignalsAlone) {
    sigset_t mask = {};
    sigaddset(&mask, SIGUSR1);
    sigprocmask(SIG_SETMASK, &mask, nullptr);
    const struct {
        const char *why, *command;
        int status;
    } rows[] = {
        {"SIGINT ends the command", "kill -INT $$; :", SIGINT},
        {"SIGQUIT ends the command", "kill -QUIT $$; :", SIGQUIT},
        {"the command has the caller's mask", "exec grep -q 'SigBlk:.0*200$' /proc/self/status", 0},
        {"there is no such command", "no-such 2>&-", 127 << 8},
    };
    for (const auto &row : rows) {
        const pid_t child = vlsys_spawn_direct(row.command);
        int status = 0;
        EXPECT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status & ~WCOREFLAG, row.status) << row.why;
        EXPECT_EQ(signal(SIGINT, SIG_DFL), SIG_DFL) << row.why;
        EXPECT_EQ(signal(SIGQUIT, SIG_DFL), SIG_DFL) << row.why;
        sigprocmask(SIG_SETMASK, nullptr, &mask);
        EXPECT_FALSE(sigismember(&mask, SIGCHLD)) << row.why;
        EXPECT_TRUE(logged(LOG_DEBUG, "pid: " + std::to_string(child)));
    }
}

TEST_F(Process, BetweenForkAndExecNothingIsLogged) {
    waitpid(vlsys_spawn_direct(":"), nullptr, 0);
    const std::string by_this_process = "[" + std::to_string(getpid()) + "]: CMD: :";
    const auto raw = take_raw_log();
    ASSERT_EQ(raw.size(), 2U);
    EXPECT_TRUE(raw[0].ends_with(by_this_process)) << raw[0];
}

TEST_F(Process, AReplyIsOneNumber) {
    const struct {
        std::string why, reply;
        int result;
        int error; // 0: errno stays as it was
    } rows[] = {
        {"a status", "256\n", 256, 0},
        {"no line feed", "123", 123, 0},
        {"below zero", "-1\n", -1, EPROTO},
        {"above an int", "2147483648\n", INT_MAX, 0},
        {"text behind it", "12a\n", -1, EPROTO},
        {"an empty line", "\n", -1, EPROTO},
        {"a NUL behind it", {"1\0", 2}, -1, EPROTO},
        {"nothing", "", -1, ECONNRESET},
    };
    for (const auto &row : rows) {
        ScriptedSurrogate surrogate(row.reply, Then::close);
        errno = 0;
        EXPECT_EQ(vlsys_system("a b"), row.result) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
        errno = 0;
        EXPECT_EQ(vlsys_spawn("a b"), row.result) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
        EXPECT_EQ(surrogate.received(), "/run\na b\n/run\na b &\n");
    }
    EXPECT_TRUE(logged(LOG_DEBUG, "CWD: /run"));
    EXPECT_TRUE(logged(LOG_INFO, "CMD: a b"));
    EXPECT_TRUE(logged(LOG_DEBUG, "\"a b\" returned 1"));
    EXPECT_TRUE(logged(LOG_DEBUG, "\"a b\" pid: 256"));
    EXPECT_TRUE(logged(LOG_DEBUG, "received 12a\n"));
}

TEST_F(Process, APipeReadIsStartedReadAndKilled) {
    const std::string longest(1023 - strlen("/run\n |\n"), 'x');
    ScriptedSurrogate surrogate("\n4711\n", Then::await_kill, "out\n256\n");
    EXPECT_EQ(vlsys_popen((longest + "x").c_str()), nullptr);
    EXPECT_EQ(errno, E2BIG);
    EXPECT_TRUE(
        logged(LOG_ERR, "snprintf(\"/run\\n" + longest + "x |\\n\"): Argument list too long"));
    FILE *const stream = vlsys_popen(longest.c_str());
    EXPECT_TRUE(logged(LOG_DEBUG, "/run\n" + longest + " |\n"));
    EXPECT_TRUE(logged(LOG_INFO, "pid: 4711"));
    EXPECT_EQ(fcntl(fileno(stream), F_GETFD), FD_CLOEXEC);
    EXPECT_EQ(getc(stream), 'o');
    fail_call("nanosleep", 1, EINTR);
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_EQ(take_waits(), (std::vector<int64_t>{second, 1})) << "it sleeps on after a signal";
    EXPECT_EQ(surrogate.received(), "/run\n" + longest + " |\nstart\nkill\n");
}

TEST_F(Process, WhatIsNoCommandIsNotSent) {
    const std::string trap = "/run/a\ntouch pwned; #";
    const struct {
        const char *why, *directory, *command;
        int error;
    } rows[] = {
        {"a line feed would end the command", "/run", "a\nb", EINVAL},
        {"a line feed would end the directory", trap.c_str(), "a", EINVAL},
        {"there is none", "/run", nullptr, EFAULT},
    };
    run("mkdir '" + trap + "'");
    ScriptedSurrogate surrogate("0\n", Then::close);
    for (const auto &row : rows) {
        ASSERT_EQ(chdir(row.directory), 0);
        EXPECT_EQ(vlsys_system(row.command), -1) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
        EXPECT_EQ(vlsys_spawn(row.command), -1) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
        EXPECT_EQ(vlsys_popen(row.command), nullptr) << row.why;
        EXPECT_EQ(errno, row.error) << row.why;
    }
    EXPECT_EQ(vlsys_spawn_direct(nullptr), -1);
    EXPECT_TRUE(logged(LOG_ERR, "asprintf(\"/run\\na\nb\\n\"): Invalid argument"));
    EXPECT_EQ(surrogate.received(), "");
}

TEST_F(Process, CommandsRunDirectlyWithoutASurrogateParent) {
    EXPECT_EQ(vlsys_surrogate_connect(1, VLSYS_SURROGATE_PORT), 0) << "not logged when quiet";
    EXPECT_EQ(vlsys_system("exit 3"), 3 << 8);
    EXPECT_EQ(take_log(), "3 connect: Connection refused\n"
                          "4 can't connect surrogate parant. fallback to direct call.\n");
    EXPECT_GT(waitpid(vlsys_spawn(":"), nullptr, 0), 0);
    EXPECT_EQ(vlsys_pclose(vlsys_popen("exit 2")), 2 << 8);
    EXPECT_EQ(take_waits(), std::vector<int64_t>());
    EXPECT_EQ(vlsys_pclose(nullptr), -1);
}
