#include "fixture.h"
#include "vlsys.h"

#include <algorithm>
#include <ctime>
#include <sys/resource.h>
#include <unistd.h>

using Load = test::Unit;
static const bool is_long = getenv("VLSYS_LONG") != nullptr;

TEST_F(Load, TimeGrowsNoFasterThanTheInterfaces) {
    test::set_interfaces({});
    clock_t few[5];
    std::fill(std::begin(few), std::end(few), CLOCKS_PER_SEC);
    for (const int factor : {1, is_long ? 32 : 16}) {
        const int count = 126 * factor;
        test::run("n=" + std::to_string(count) +
                  "; seq -f 'net.ipv6.conf.e%g.accept_ra_defrtr = 1' $n >/etc/sysctl.d/velmora; cd "
                  "/etc/sysconfig/network-scripts; for i in $(seq $n -2 2); do echo link add "
                  "e$i group 7 type veth peer name e$((i-1)); >ifcfg-e$i; >ifcfg-e$((i-1)); done | "
                  "ip -batch -");
        char(*list)[VLSYS_IFNAME_SIZE] = nullptr;
        vlsys_ifconf nif = {};
        vlsys_gw4 gw4 = {};
        const vlsys_gw6 gw6 = {};
        const auto after = [](int result) { return result == 0 ? clock() : -1; };
        const clock_t at[] = {clock(),
                              after(vlsys_get_ifname_list(&list) - count),
                              after(vlsys_set_ipv4_default_gateway2(&gw4)),
                              after(vlsys_set_ipv6_default_gateway2(&gw6)),
                              after(vlsys_get_ipv4_default_gateway2(&gw4)),
                              after(vlsys_get_netif("e1", &nif))};
        for (size_t i = 0; i < std::size(few); few[i] = at[i + 1] - at[i], i++)
            EXPECT_TRUE(at[i + 1] >= at[i] && at[i + 1] - at[i] < few[i] * factor * 2 + 10000) << i;
        EXPECT_EQ(list[count - 1], "e" + std::to_string(count));
        free(list);
        test::run("ip link del group 7");
    }
}

TEST_F(Load, LargeFilesAndTreesAndManyEditsLeaveNothing) {
    test::run("n=" + std::to_string(is_long ? 100000 : 10000) +
              "; cd /run && mkdir -p $(printf 'dd/%.0s' $(seq 2000)) w/d && (cd w/d && seq $n | "
              "xargs touch) && (seq -f KEY%0200.0f= 50000; echo HOSTNAME=1) | tee before "
              ">/etc/sysconfig/network");
    const struct rlimit few = {32, 32};
    setrlimit(RLIMIT_NOFILE, &few);
    [[maybe_unused]] const long before = test::peak_memory();
    EXPECT_EQ(vlsys_set_hostname("1"), 0);
    test::run("cmp /etc/sysconfig/network /run/before && rm /etc/sysconfig/network");
    for (int i = is_long ? 10000 : 1000; i > 0; i--)
        ASSERT_EQ(vlsys_set_hostname("1"), 0);
    EXPECT_EQ(vlsys_remove_tree("/run/dd") + vlsys_remove_tree("/run/w"), 0);
#ifndef __SANITIZE_ADDRESS__ // which keeps what was freed for a while
    EXPECT_LT(test::peak_memory() - before, is_long ? 24 << 10 : 12 << 10); // the file, or names
#endif
}
