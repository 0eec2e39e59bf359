#include "fixture.h"
#include "vlsys.h"

#include <ctime>
#include <sys/resource.h>
#include <unistd.h>

using Load = test::Unit;
static const bool is_long = getenv("VLSYS_LONG") != nullptr;

static clock_t after(int result) { // processor time, with a clock that waits do not move
    EXPECT_EQ(result, 0);
    return clock();
}

TEST_F(Load, TimeGrowsNoFasterThanTheInterfaces) {
    test::set_interfaces({});
    vlsys_setlogmask(LOG_UPTO(LOG_ERR));
    clock_t few[5] = {};
    for (const int factor : {1, is_long ? 32 : 16}) {
        const std::string last = std::to_string(126 * factor);
        test::run("ip link del group 7 2>&-; for i in $(seq 2 2 " + last +
                  "); do echo link add e$i "
                  "group 7 type veth peer name e$((i-1)); done | ip -batch - && for i in $(seq " +
                  last + "); do >/etc/sysconfig/network-scripts/ifcfg-e$i; done");
        char(*list)[VLSYS_IFNAME_SIZE] = nullptr;
        vlsys_ifconf nif = {};
        const vlsys_dns dns = {};
        vlsys_gw4 gw4 = {};
        const clock_t at[] = {clock(),
                              after(vlsys_get_ifname_list(&list) - 126 * factor),
                              after(vlsys_set_dns_settings(&dns)),
                              after(vlsys_set_ipv4_default_gateway2(&gw4)),
                              after(vlsys_get_ipv4_default_gateway2(&gw4)),
                              after(vlsys_get_netif("e1", &nif))};
        for (size_t i = 0; i < std::size(few); few[i] = at[i + 1] - at[i], i++)
            EXPECT_TRUE(factor == 1 || at[i + 1] - at[i] < factor * few[i] * 5 / 2 + 10000) << i;
        EXPECT_EQ(list[126 * factor - 1], "e" + last);
        free(list);
    }
    test::run("ip link del group 7");
}

TEST_F(Load, LargeFilesAndTreesAndManyEditsLeaveNothing) {
    test::run("cd /etc/sysconfig && seq -f KEY%0200.0f= 50000 >network && echo HOSTNAME=1 "
              ">>network && cp network before && cd /run && mkdir -p wide $(printf 'dd/%.0s' $(seq "
              "2000)) $(printf '%0250d/' $(seq 200)) && cd wide && seq " +
              std::to_string(is_long ? 100000 : 10000) + " | xargs touch");
    const struct rlimit few = {32, 32};
    setrlimit(RLIMIT_NOFILE, &few);
    const long before = test::peak_memory();
    EXPECT_EQ(vlsys_set_hostname("1"), 0);
    test::run("cd /etc/sysconfig && cmp network before && rm network");
    for (int i = is_long ? 10000 : 1000; i > 0; i--)
        ASSERT_EQ(vlsys_set_hostname("1"), 0);
    EXPECT_EQ(vlsys_remove_tree("/run/dd") + vlsys_remove_tree("/run/wide"), 0);
    EXPECT_EQ(vlsys_remove_tree(("/run/" + std::string(249, '0') + "1").c_str()), ENAMETOOLONG);
    test::run("test ! -e /run/dd -a ! -e /run/wide");
#ifndef __SANITIZE_ADDRESS__ // which keeps what was freed for a while
    EXPECT_LT(test::peak_memory() - before, is_long ? 24 << 10 : 6 << 10); // a directory's names
#endif
}
