#include "fixture.h"
#include "vlsys.h"

#include <climits>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/wait.h>

using namespace test;
using Process = Unit;
using Then = ScriptedSurrogate::Then;

TEST_F(Process, StatusTextSaysHowItEnded) {
    using Row = std::tuple<pid_t, const char *, int, int, const char *>;
    for (const auto &[pid, name, status, result, text] :
         {Row{0, "x", 0, 0, "exited (x), status: 0"},
          Row{812, nullptr, 0xff00, 255, "exited pid: 812 (?), status: 255"},
          Row{0, "x", 9, 256, "exited (x), abnormally, signaled: 9"},
          Row{0, "x", 0x137f, 256, "exited (x), abnormally"}}) {
        char line[64] = "";
        EXPECT_EQ(vlsys_exit_status_text(line, sizeof line, pid, name, status), result);
        EXPECT_STREQ(line, text);
    }
}

TEST_F(Process, DirectStartLeavesTheSignalsAlone) {
    sigset_t mask = {};
    sigaddset(&mask, SIGUSR1);
    sigprocmask(SIG_SETMASK, &mask, nullptr);
    const std::string same_mask = "while read k v; do case $k$v in SigBlk:0000000000000200) exit;; "
                                  "esac; done </proc/$$/status; exit 1";
    using Row = std::pair<std::string, int>;
    for (const auto &[command, end] :
         {Row{"kill -INT $$; :", SIGINT}, Row{"no-such 2>&-", 127 << 8},
          Row{"kill -QUIT $$; :", SIGQUIT}, Row{same_mask, 0}}) {
        const pid_t child = vlsys_spawn_direct(command.c_str());
        int status = 0;
        EXPECT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status & ~WCOREFLAG, end) << command;
        EXPECT_TRUE(signal(SIGINT, SIG_DFL) == SIG_DFL && signal(SIGQUIT, SIG_DFL) == SIG_DFL);
        sigprocmask(SIG_SETMASK, nullptr, &mask);
        EXPECT_TRUE(sigismember(&mask, SIGUSR1) && !sigismember(&mask, SIGCHLD));
        const std::string log = take_log(); // of two processes, in any order
        EXPECT_NE(log.find("7 CMD: " + command + "\n"), std::string::npos);
        EXPECT_NE(log.find("7 pid: " + std::to_string(child) + "\n"), std::string::npos);
    }
}

TEST_F(Process, AReplyIsOneNumber) {
    ASSERT_EQ(chdir("/run"), 0);
    using Row = std::tuple<std::string, int, bool>;
    for (const auto &[reply, result, is_number] :
         {Row{"256\n", 256, true}, Row{"123", 123, true}, Row{"-1\n", -1, true},
          Row{"2147483648\n", INT_MAX, true}, Row{"-99999999999999999999\n", INT_MIN, true},
          Row{"12a\n", -1, false}, Row{"\n", -1, false}, Row{{"1\0", 2}, -1, false},
          Row{"", -1, false}}) {
        ScriptedSurrogate surrogate(reply, Then::close);
        const int error = reply.empty() ? ECONNRESET : EPROTO; // says why a result is negative
        const auto told = [number = is_number](const std::string &what, int value) {
            return number ? "7 \"a b\" " + what + std::to_string(value) + "\n" : "";
        };
        errno = 0;
        EXPECT_EQ(vlsys_system("a b"), result);
        EXPECT_EQ(errno, result < 0 ? error : 0);
        EXPECT_EQ(take_log(), "7 CWD: /run\n6 CMD: a b\n" + told("returned ", result >> 8 & 0xff));
        errno = 0;
        EXPECT_EQ(vlsys_spawn("a b"), result);
        EXPECT_EQ(errno, result < 0 ? error : 0);
        const char *const text = reply.c_str(); // up to a NUL
        EXPECT_EQ(take_log(), std::string("7 CWD: /run\n6 CMD: a b\n7 received ") + text + "\n" +
                                  told("pid: ", result));
        EXPECT_EQ(surrogate.received(), "/run\na b\n/run\na b &\n");
    }
}

TEST_F(Process, APipeReadIsStartedReadAndKilled) {
    ASSERT_EQ(chdir("/run"), 0);
    const std::string longest(1023 - strlen("/run\n |\n"), 'x');
    using Row = std::pair<const char *, const char *>;
    for (const auto &[reply, pid] :
         {Row{"\n\n4711\n", "6 pid: 4711\n"}, Row{"\n\n", ""}, Row{" \n5\n", "6 pid: 0\n"}}) {
        ScriptedSurrogate surrogate(reply, Then::await_kill, "out\n256\n");
        EXPECT_EQ(vlsys_popen((longest + "x").c_str()), nullptr);
        EXPECT_EQ(errno, E2BIG);
        EXPECT_EQ(take_log(), "7 CWD: /run\n3 snprintf(\"/run\\n" + longest +
                                  "x |\\n\"): Argument list too long\n");
        FILE *const stream = vlsys_popen(longest.c_str());
        EXPECT_EQ(take_log(), "7 CWD: /run\n7 /run\n" + longest + " |\n\n" + pid);
        EXPECT_EQ(fcntl(fileno(stream), F_GETFD), FD_CLOEXEC);
        EXPECT_EQ(getc(stream), 'o');
        EXPECT_EQ(vlsys_pclose(stream), 0);
        EXPECT_EQ(take_waits(), std::vector<int64_t>{1000000000});
        EXPECT_EQ(surrogate.received(), "/run\n" + longest + " |\nstart\nkill\n");
    }
    ScriptedSurrogate surrogate("1\n", Then::await_start);
    FILE *const stream = vlsys_popen("a b");
    shutdown(fileno(stream), SHUT_WR);
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_NE(take_log().find(", \"kill\\n\"): Broken pipe\n"), std::string::npos);
}

TEST_F(Process, RunsDirectlyOnlyWhenItCannotConnect) {
    EXPECT_EQ(vlsys_surrogate_connect(1, VLSYS_SURROGATE_PORT), 0); // not logged
    EXPECT_EQ(vlsys_system("exit 3"), 3 << 8);
    EXPECT_EQ(take_log(), "3 connect: Connection refused\n"
                          "4 can't connect surrogate parant. fallback to direct call.\n");
    EXPECT_GT(waitpid(vlsys_spawn(":"), nullptr, 0), 0);
    EXPECT_EQ(vlsys_pclose(vlsys_popen("exit 2")), 2 << 8);
    EXPECT_TRUE(take_waits().empty());
    EXPECT_EQ(vlsys_pclose(nullptr), -1);
}

TEST_F(Process, SignalsCutNeitherRequestNorReply) {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    vlsys_setlogmask(LOG_UPTO(LOG_ERR));
    const std::string command(8 << 20, 'x');
    ScriptedSurrogate surrogate("0\n", Then::close);
    ualarm(200, 200);
    EXPECT_EQ(vlsys_system(command.c_str()), 0);
    ualarm(0, 0);
    EXPECT_TRUE(surrogate.received().ends_with("\n" + command + "\n"));
}
