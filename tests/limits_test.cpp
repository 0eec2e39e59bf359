// Arguments, texts, files and loads at their limits and beyond.
#include "fixture.h"
#include "vlsys.h"

#include <cstring>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace test;
using std::string;

using Limits = Unit;

TEST_F(Limits, NullArgumentsAreRefusedInSilence) {
    vlsys_ifconf nif = {};
    EXPECT_EQ(vlsys_get_timezone(nullptr, 9), 0U);
    EXPECT_EQ(vlsys_get_utc_offset(nullptr, 9), 0U);
    EXPECT_EQ(vlsys_set_netif(nullptr, &nif), EFAULT);
    EXPECT_EQ(vlsys_set_netif("lo", nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_netif(nullptr, &nif), EFAULT);
    EXPECT_EQ(vlsys_get_netif("lo", nullptr), EFAULT);
    EXPECT_EQ(vlsys_set_dns_settings(nullptr), EFAULT);
    EXPECT_EQ(vlsys_set_ipv4_default_gateway2(nullptr), EFAULT);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway2(nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_ipv4_default_gateway2(nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_ipv6_default_gateway2(nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_hostname(nullptr), EFAULT);
    EXPECT_EQ(vlsys_address_check(nullptr, nullptr, nullptr, nullptr, nullptr), EFAULT);
    EXPECT_EQ(vlsys_remove_tree(nullptr), EFAULT);
    EXPECT_EQ(vlsys_realpath(nullptr, nullptr, 9), -EFAULT);
    EXPECT_EQ(vlsys_get_block_device_size(nullptr), -EFAULT);
    EXPECT_EQ(take_log(), "");
}

TEST_F(Limits, FullFieldsEndWithTheField) {
    set_interfaces({"eth0"});
    const Files before = unit_files();
    vlsys_gw4 gw4;
    memset(&gw4, 'x', sizeof gw4);
    EXPECT_EQ(vlsys_set_ipv4_default_gateway2(&gw4), 0);
    EXPECT_EQ(changes(before), "network\n+GATEWAY=" + string(sizeof gw4.addr, 'x') + "\n");
}

TEST_F(Limits, LinksAreReplacedNotWrittenThrough) {
    set_interfaces({"eth0"});
    run("ln -sf true /usr/bin/fc-cache; cp -r /etc/sysconfig /etc/sysctl.d /run; cd /run;"
        "for file in sysconfig/[cn]*k sysconfig/*/* sysctl.d/*; do"
        "    ln -sf /run/$file /etc/$file;"
        " done; mkdir outside; mv sys* outside; ln -s outside/* .");
    const Files outside = unit_files("/run/outside");
    EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0);
    EXPECT_EQ(changes(outside, unit_files("/run/outside")), "");
    run("! find /etc/sysconfig/clock /etc/sysconfig/network /etc/sysconfig/*/ifcfg-eth0 "
        "/etc/sysctl.d/velmora -type l | grep .");
}

TEST_F(Limits, ADeepTreeIsRemovedWithFewDescriptors) {
    run("cd /run && mkdir -p $(printf 'dd/%.0s' $(seq 2000))");
    const struct rlimit few = {32, 32};
    setrlimit(RLIMIT_NOFILE, &few);
    EXPECT_EQ(vlsys_remove_tree("/run/dd"), 0);
    EXPECT_NE(access("/run/dd", F_OK), 0);
}

TEST_F(Limits, ARootPathMayBeRelativeButNotTooLong) {
    run("mkdir -p /run/h/etc/sysconfig");
    ASSERT_EQ(chdir("/run"), 0);
    vlsys_exit();
    setenv("VL_ROOT", ("h" + string(4065, '/')).c_str(), 1);
    ASSERT_EQ(vlsys_init(), 0);
    EXPECT_EQ(vlsys_set_hostname("x"), 0) << "the longest whose files have room";
    EXPECT_EQ(read_file("h/etc/sysconfig/network"), "HOSTNAME=x\n");
    vlsys_exit();
    setenv("VL_ROOT", ("h" + string(4066, '/')).c_str(), 1);
    ASSERT_EQ(vlsys_init(), 0);
    EXPECT_EQ(vlsys_set_hostname("y"), ENAMETOOLONG);
}

TEST_F(Limits, ClosedStandardDescriptorsTakeNothing) {
    set_interfaces({"eth0"});
    run("ln -sf true /usr/bin/fc-cache");
    for (const char *closed : {"<&-", ">&-", "2>&-", "<&- >&- 2>&-"}) {
        run(string(FACTORY_PROGRAM " >/run/out 2>&1 ") + closed);
        run("! grep -r dest: /etc/sysconfig"); // what the tool prints
        EXPECT_EQ(take_log().find("dest: "), string::npos) << closed;
    }
}

TEST_F(Limits, CommandsInheritNothing) {
    vlsys_closelog();
    close_range(3, ~0U, CLOSE_RANGE_CLOEXEC); // of whoever runs the tests
    const string list = "ls /proc/self/fd | tr '\\n' ' ' >>/run/fds";
    write_file("/run/fc-cache", list);
    run("chmod +x /run/fc-cache && ln -sf /run/fc-cache /usr/bin/fc-cache");
    EXPECT_EQ(vlsys_fc_cache(), 0);
    run(SURROGATE_PROGRAM);
    FILE *const stream = vlsys_popen("cat");
    waitpid(vlsys_spawn_direct(list.c_str()), nullptr, 0);
    EXPECT_EQ(vlsys_pclose(stream), 0);
    EXPECT_EQ(read_file("/run/fds"), "0 1 2 3 0 1 2 3 ");
}
