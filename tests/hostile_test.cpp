#include "fixture.h"
#include "vlsys.h"

#include <sys/wait.h>
#include <unistd.h>

using namespace test;
using std::string;
using Hostile = Unit;
using Then = ScriptedSurrogate::Then;

TEST_F(Hostile, PlantedLinksAreReplacedNotWrittenThrough) {
    set_interfaces({"eth0"});
    run("mkdir /run/out && cd /run/out && echo A=1 >file && chmod 600 file && cd /etc && ln -s "
        "/run/out localtime.new && ln -s out /run/link && ln -sf /run/out/none sysctl.d/velmora && "
        "for l in network clock ../resolv.conf; do ln -sf /run/out/file sysconfig/$l; done");
    ScriptedSurrogate surrogate("256\n", Then::close);
    EXPECT_EQ(vlsys_set_timezone("UTC") + vlsys_set_ipv6_default_gateway("") +
                  vlsys_set_hostname("h"),
              0);
    EXPECT_EQ(vlsys_network_restart() + vlsys_remove_tree("/run/link/"), 1);
    run("cd /etc && ! find sysconfig sysctl.d resolv.conf /run/link -type l 2>&- | grep .");
    EXPECT_EQ(read_file("/etc/sysconfig/network") + read_file("/etc/sysconfig/clock"),
              "A=1\nHOSTNAME=h\nA=1\nZONE=\"UTC\"\n");
    EXPECT_EQ(list_directory("/run/out") + read_file("/run/out/file"), "file\nA=1\n");
    EXPECT_EQ(mode_of("/run/out/file"), 0600U);
}

TEST_F(Hostile, AnAnswerIsWhatComesFirstAndAFloodIsNotCollected) {
    string lines[] = {"MainSerialNumber: 12345 ", "MainSerialNumber: 12345 "};
    lines[1].append(32 << 20, 'x'); // the other one comes byte by byte
    const long before = peak_memory();
    for (const auto &[answer, then, result, bytes] :
         {std::tuple{string(8192, 'x'), Then::flood, -1, 12 << 20}, {"2", Then::hold, 2, 0}}) {
        ScriptedSurrogate surrogate(answer, then);
        EXPECT_EQ(vlsys_system("a") + vlsys_spawn("a"), 2 * result);
        FILE *const stream = vlsys_popen("a");
        for (int i = 0; i < bytes; i++)
            ASSERT_EQ(getc_unlocked(stream), 'x');
        EXPECT_EQ(vlsys_pclose(stream), 0);
    }
    for (string &line : lines) {
        ScriptedSurrogate surrogate("1\n", Then::await_start, std::move(line));
        char serial[16] = "";
        EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), 5);
    }
    EXPECT_LT(peak_memory() - before, 10 << 10);
}

TEST_F(Hostile, ARootPathMayBeRelativeButNotTooLong) {
    run("mkdir -p /run/h/etc/sysconfig");
    ASSERT_EQ(chdir("/run"), 0);
    for (const auto slashes : {0U, 4065U, 4066U, 4080U, 9999U}) {
        vlsys_exit();
        setenv("VL_ROOT", ("h" + string(slashes, '/')).c_str(), 1);
        ASSERT_EQ(vlsys_init(), 0);
        EXPECT_EQ(vlsys_set_hostname("x"), slashes > 4065 ? ENAMETOOLONG : 0) << slashes;
        EXPECT_EQ(unlink("h/etc/sysconfig/network"), slashes > 4065 ? -1 : 0);
        run("test $(find h | wc -l) = 3");
    }
    unsetenv("VL_ROOT");
}

TEST_F(Hostile, ClosedStandardDescriptorsTakeNothing) {
    set_interfaces({"eth0"});
    run("cd /usr/bin && rm -f fc-cache && echo echo dest: >fc-cache && chmod 755 fc-cache");
    for (const char *closed : {"<&-", ">&-", "2>&-", "<&- >&-", "<&- >&- 2>&-"}) {
        run(string(FACTORY_PROGRAM " >/run/o 2>&1 ") + closed + " && ! grep -r dest: /etc/sysc*");
        EXPECT_EQ(take_log().find("dest: "), string::npos) << closed; // what has the log's form
    }
}

TEST_F(Hostile, CommandsInheritNothing) {
    vlsys_closelog();
    close_range(3, ~0U, CLOSE_RANGE_CLOEXEC); // of whoever runs the tests
    const string list = "ls /proc/self/fd | tr '\\n' ' ' >>/run/fds";
    run("mkdir /run/bin && cd /run/bin && echo \"" + list +
        "\" | tee fc-cache >service && chmod +x *");
    setenv("PATH", "/run/bin:/usr/bin:/bin", 1);
    FILE *const direct = vlsys_popen(list.c_str());
    EXPECT_EQ(vlsys_fc_cache() + vlsys_network_restart(), 0);
    run(SURROGATE_PROGRAM);
    FILE *const stream = vlsys_popen("cat");
    EXPECT_EQ(vlsys_system(list.c_str()), 0);
    waitpid(vlsys_spawn_direct(list.c_str()), nullptr, 0);
    EXPECT_EQ(vlsys_pclose(direct) + vlsys_pclose(stream), 0);
    EXPECT_EQ(read_file("/run/fds"), "0 1 2 3 0 1 2 3 0 1 2 3 0 1 2 3 0 1 2 3 ");
}
