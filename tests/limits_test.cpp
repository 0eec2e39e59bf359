// Arguments, texts, files and loads at their limits and beyond.
#include "fixture.h"
#include "operations.h"

#include <cstring>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace test;
using std::string;
using Then = ScriptedSurrogate::Then;

class Limits : public Unit {};

// The processor time, in microseconds, of an operation in a process of its own.
static long time_of(const Operation &operation) {
    const pid_t process = fork();
    if (process == 0) {
        static Records records;
        if (!freopen("/dev/null", "w", stdout))
            abort();
        operation.run(records);
        _exit(0);
    }
    int status = 0;
    struct rusage usage = {};
    wait4(process, &status, 0, &usage);
    EXPECT_EQ(status, 0) << operation.name;
    return (usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) * 1000000 + usage.ru_utime.tv_usec +
           usage.ru_stime.tv_usec;
}

TEST_F(Limits, NullArgumentsAreRefusedInSilence) {
    vlsys_ifconf nif = {};
    const struct {
        const char *what;
        int64_t result;
        int64_t expected;
    } calls[] = {
        {"zone", vlsys_set_timezone(nullptr), -EFAULT},
        {"buffer of the zone", static_cast<int64_t>(vlsys_get_timezone(nullptr, 9)), 0},
        {"buffer of the offset", static_cast<int64_t>(vlsys_get_utc_offset(nullptr, 9)), 0},
        {"interface to set", vlsys_set_netif(nullptr, &nif), EFAULT},
        {"setting of an interface", vlsys_set_netif("lo", nullptr), EFAULT},
        {"interface to read", vlsys_get_netif(nullptr, &nif), EFAULT},
        {"state of an interface", vlsys_get_netif("lo", nullptr), EFAULT},
        {"DNS setting", vlsys_set_dns_settings(nullptr), EFAULT},
        {"IPv4 gateway to set", vlsys_set_ipv4_default_gateway2(nullptr), EFAULT},
        {"IPv6 gateway to set", vlsys_set_ipv6_default_gateway2(nullptr), EFAULT},
        {"IPv4 gateway to read", vlsys_get_ipv4_default_gateway2(nullptr), EFAULT},
        {"IPv6 gateway to read", vlsys_get_ipv6_default_gateway2(nullptr), EFAULT},
        {"host name", vlsys_get_hostname(nullptr), EFAULT},
        {"interface to check", vlsys_address_check(nullptr, nullptr, nullptr, nullptr, nullptr),
         EFAULT},
        {"interfaces to check",
         vlsys_address_check2(nullptr, 1, nullptr, nullptr, nullptr, nullptr), EFAULT},
        {"stream", vlsys_pclose(nullptr), -1},
        {"tree", vlsys_remove_tree(nullptr), EFAULT},
        {"path", vlsys_realpath(nullptr, nullptr, 9), -EFAULT},
        {"device", vlsys_get_block_device_size(nullptr), -EFAULT},
    };
    for (const auto &call : calls)
        EXPECT_EQ(call.result, call.expected) << call.what;
    EXPECT_EQ(take_log(), "");
}

TEST_F(Limits, FullFieldsEndWithTheField) {
    set_interfaces({"eth0"});
    const Files before = unit_files();
    vlsys_gw4 gw4;
    memset(&gw4, 'x', sizeof gw4);
    EXPECT_EQ(vlsys_set_ipv4_default_gateway2(&gw4), 0);
    EXPECT_EQ(changes(before), "network\n+GATEWAY=" + string(sizeof gw4.addr, 'x') + "\n");
    vlsys_ifconf nif;
    memset(&nif, 'x', sizeof nif);
    nif.ipv4_mode = VLSYS_MODE_MANUAL;
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0);
    EXPECT_NE(changes(before).find("+IPADDR=" + string(sizeof nif.addr, 'x') + "\n"), string::npos);
    EXPECT_NE(changes(before).find("+NETMASK=" + string(sizeof nif.netmask, 'x') + "\n"),
              string::npos);
}

// The files, by their paths in /etc, that an operation changes.
static std::vector<string> files_changed_by(const Operation &operation) {
    const Files before = unit_files();
    time_of(operation);
    const Files after = unit_files();
    std::vector<string> changed;
    for (const auto &[path, text] : before)
        if (!text.starts_with("-> ") && (!after.contains(path) || after.at(path) != text))
            changed.push_back(path);
    return changed;
}

TEST_F(Limits, PlantedLinksAreReplacedNotWrittenThrough) {
    prepare_operations();
    for (const Operation &operation : operations) {
        SCOPED_TRACE(operation.name);
        reset_files();
        const std::vector<string> paths = files_changed_by(operation);
        reset_files();
        run("rm -rf /run/outside");
        for (const string &path : paths)
            run("mkdir -p /run/outside/$(dirname " + path + ") && mv /etc/" + path +
                " /run/outside/" + path + " && ln -s /run/outside/" + path + " /etc/" + path);
        const Files outside = paths.empty() ? Files() : unit_files("/run/outside");
        time_of(operation);
        const Files files = unit_files();
        for (const string &path : paths) {
            EXPECT_EQ(unit_files("/run/outside").at(path), outside.at(path));
            EXPECT_FALSE(files.contains(path) && files.at(path).starts_with("-> ")) << path;
        }
    }
}

TEST_F(Limits, TimeGrowsNoFasterThanTheInterfaces) {
    const int few = 64;
    const int many = 1024;
    std::map<string, long> time_with_few;
    prepare_operations();
    for (const int count : {few, many}) {
        reset_files();
        run("cd /etc/sysconfig/network-scripts;"
            "for i in $(seq 2 2 " +
            std::to_string(count) +
            "); do"
            "    echo link add e$i group 7 type veth peer name e$((i - 1));"
            "    touch ifcfg-e$i ifcfg-e$((i - 1));"
            " done | ip -batch -");
        for (const Operation &operation : operations) {
            const long time = time_of(operation);
            if (count == few)
                time_with_few[operation.name] = time;
            else
                EXPECT_LT(time, time_with_few[operation.name] * 2 * many / few + 20000)
                    << operation.name << ", in microseconds";
        }
        run("ip link del group 7");
    }
}

TEST_F(Limits, LargeFilesAndTreesAndManyRunsLeaveNothing) {
    run("cd /run && mkdir -p $(printf 'dd/%.0s' $(seq 2000)) wide/d && (cd wide/d && seq 10000 | "
        "xargs touch) && (seq -f KEY%0200.0f= 50000; echo HOSTNAME=1) | tee before "
        ">/etc/sysconfig/network");
    const struct rlimit few = {32, 32};
    setrlimit(RLIMIT_NOFILE, &few);
    [[maybe_unused]] const long memory = peak_memory();
    EXPECT_EQ(vlsys_set_hostname("1"), 0);
    run("cmp /etc/sysconfig/network /run/before && rm /etc/sysconfig/network");
    for (int i = 0; i < 1000; i++)
        ASSERT_EQ(vlsys_set_hostname("1"), 0);
    EXPECT_EQ(vlsys_remove_tree("/run/dd"), 0);
    EXPECT_EQ(vlsys_remove_tree("/run/wide"), 0);
    run("! ls -d /run/dd /run/wide");
#ifndef __SANITIZE_ADDRESS__ // which keeps what was freed for a while
    EXPECT_LT(peak_memory() - memory, 6 << 10) << "KiB";
#endif
}

TEST_F(Limits, AFloodIsNotCollected) {
    string line = "MainSerialNumber: 12345 ";
    line.append(32 << 20, 'x');
    const long memory = peak_memory();
    {
        ScriptedSurrogate surrogate(string(8192, 'x'), Then::flood);
        EXPECT_EQ(vlsys_system("a"), -1);
        EXPECT_EQ(vlsys_spawn("a"), -1);
        FILE *const stream = vlsys_popen("a");
        for (int i = 0; i < 12 << 20; i++)
            ASSERT_EQ(getc_unlocked(stream), 'x');
        EXPECT_EQ(vlsys_pclose(stream), 0);
    }
    ScriptedSurrogate surrogate("1\n", Then::await_start, std::move(line));
    char serial[16] = "";
    EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), 5);
    EXPECT_LT(peak_memory() - memory, 10 << 10) << "KiB";
}

TEST_F(Limits, ARootPathMayBeRelativeButNotTooLong) {
    run("mkdir -p /run/h/etc/sysconfig");
    ASSERT_EQ(chdir("/run"), 0);
    const struct {
        const char *why;
        size_t slashes;
        int result;
    } cases[] = {
        {"relative to the working directory", 0, 0},
        {"the longest whose files have room", 4065, 0},
        {"one byte longer", 4066, ENAMETOOLONG},
        {"no room for the file's name", 4080, ENAMETOOLONG},
        {"longer than any path", 9999, ENAMETOOLONG},
    };
    for (const auto &[why, slashes, result] : cases) {
        vlsys_exit();
        setenv("VL_ROOT", ("h" + string(slashes, '/')).c_str(), 1);
        ASSERT_EQ(vlsys_init(), 0);
        EXPECT_EQ(vlsys_set_hostname("x"), result) << why;
        EXPECT_EQ(unlink("h/etc/sysconfig/network"), result == 0 ? 0 : -1) << why;
        EXPECT_EQ(changes({}, unit_files("/run/h")), "") << why;
    }
    unsetenv("VL_ROOT");
}

TEST_F(Limits, ClosedStandardDescriptorsTakeNothing) {
    set_interfaces({"eth0"});
    run("ln -sf true /usr/bin/fc-cache");
    for (const char *closed : {"<&-", ">&-", "2>&-", "<&- >&-", "<&- >&- 2>&-"}) {
        run(string(FACTORY_PROGRAM " >/run/out 2>&1 ") + closed);
        run("! grep -r dest: /etc/sysconfig"); // what the tool prints
        EXPECT_EQ(take_log().find("dest: "), string::npos) << closed;
    }
}

TEST_F(Limits, CommandsInheritNothing) {
    vlsys_closelog();
    close_range(3, ~0U, CLOSE_RANGE_CLOEXEC); // of whoever runs the tests
    const string list = "ls /proc/self/fd | tr '\\n' ' ' >>/run/fds";
    run("mkdir /run/bin && cd /run/bin && echo \"" + list + "\" | tee fc-cache >service");
    run("chmod +x /run/bin/*");
    setenv("PATH", "/run/bin:/usr/bin:/bin", 1);
    FILE *const direct = vlsys_popen(list.c_str());
    EXPECT_EQ(vlsys_fc_cache(), 0);
    run(SURROGATE_PROGRAM);
    FILE *const stream = vlsys_popen("cat");
    EXPECT_EQ(vlsys_system(list.c_str()), 0);
    waitpid(vlsys_spawn_direct(list.c_str()), nullptr, 0);
    EXPECT_EQ(vlsys_pclose(direct), 0);
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_EQ(read_file("/run/fds"), "0 1 2 3 0 1 2 3 0 1 2 3 0 1 2 3 ");
}
