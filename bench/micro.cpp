// Calls of the library beside their peers. A benchmark is named <row>/<subject>/<who>: "ours", or
// the peer. bench.py runs them with random interleaving and pairs the repetitions.
#include "bench/bare.h"
#include "netconf/edit.h"
#include "vlsys.h"

#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>
#include <unistd.h>
#include <vector>

// The keys of an interface's file; further ones are numbered.
static std::string key(int i) {
    // clang-format off
    static const char *const keys[] = {
        "DEVICE", "TYPE", "ONBOOT", "BOOTPROTO", "NAME", "IPADDR", "NETMASK", "BROADCAST",
        "NM_CONTROLLED", "USERCTL", "PEERDNS", "DNS1", "DNS2", "DOMAIN", "DEFROUTE", "IPV6INIT",
        "IPV6ADDR", "IPV6_ROUTER", "IPV6_AUTOCONF", "DHCPV6C", "MTU", "ZONE", "ARPCHECK",
        "ETHTOOL_OPTS", "LINKDELAY", "NOZEROCONF", "PERSISTENT_DHCLIENT", "DHCP_HOSTNAME",
        "IPV4_FAILURE_FATAL", "IPV6_PEERDNS"};
    // clang-format on
    return i < static_cast<int>(std::size(keys)) ? keys[i] : "KEY" + std::to_string(i);
}

// An interface's file of `lines` lines, three levels down as on the appliance, and items that set
// `count` of its keys, evenly spread, or remove as many that it lacks.
struct EditInput {
    EditInput(int lines, int count, bool absent = false) {
        const char *const root = getenv("BENCH_DIRECTORY");
        path = std::string(root ? root : "/dev/shm") + "/etc/sysconfig/network-scripts/ifcfg-eth0";
        const vlsys::edit_item none = {};
        vlsys::edit(path.c_str(), &none, 0); // makes the directory
        for (int i = 0; i < lines; i++)
            content += key(i) + "=a value of some length\n";
        std::ofstream(path) << content;
        for (int i = 0; i < count; i++)
            keys.push_back(absent ? "KEY_" + std::to_string(i)
                                  : key(static_cast<int>(int64_t{i} * lines / count)));
        for (const std::string &name : keys)
            items.push_back({absent, name.c_str(), "a value of some length"});
    }

    std::string path;
    std::string content; // as it is after the edit, too
    std::vector<std::string> keys;
    std::vector<vlsys::edit_item> items;
};

static void edit_ours(benchmark::State &state, int lines, int count, bool absent) {
    EditInput input(lines, count, absent);
    for (auto _ : state)
        if (vlsys::edit(input.path.c_str(), input.items.data(),
                        static_cast<uint32_t>(input.items.size())) != 0)
            state.SkipWithError("edit");
}

static void edit_bare(benchmark::State &state, int lines, int count, bool early_mode) {
    EditInput input(lines, count);
    for (auto _ : state)
        if (!replace_bare(input.path.c_str(), input.content, early_mode))
            state.SkipWithError("replace_bare");
}

static void log_ours(benchmark::State &state) {
    for (auto _ : state)
        vlsys_log(LOG_INFO, "IPv4 (%s): %s/%d", "eth0", "192.168.10.20", 24);
}

// The same line with nothing but the C library's own calls.
static void log_syslog(benchmark::State &state) {
    for (auto _ : state)
        syslog(LOG_INFO, "[%d]: IPv4 (%s): %s/%d", gettid(), "eth0", "192.168.10.20", 24);
}

static void log_printf(benchmark::State &state) {
    for (auto _ : state)
        printf("%s[%d]: <%s>: [%d]: IPv4 (%s): %s/%d\n", "bench", getpid(), "INFO", gettid(),
               "eth0", "192.168.10.20", 24);
}

static void system_ours(benchmark::State &state) {
    vlsys_setlogmask(LOG_UPTO(LOG_WARNING));
    for (auto _ : state)
        if (vlsys_system("true") != 0)
            state.SkipWithError("vlsys_system");
    vlsys_setlogmask(LOG_UPTO(LOG_DEBUG));
}

static void system_libc(benchmark::State &state) {
    for (auto _ : state)
        if (system("true") != 0)
            state.SkipWithError("system");
}

template <class Function, class... Arguments>
static void add(const std::string &name, Function *function, Arguments... arguments) {
    benchmark::RegisterBenchmark(name.c_str(), function, arguments...)
        ->UseRealTime()
        ->Unit(benchmark::kMicrosecond);
}

int main(int argc, char **argv) {
    add("edit/12 items, 30 lines/ours", edit_ours, 30, 12, false);
    add("edit/12 items, 30 lines/bare system calls", edit_bare, 30, 12, false);
    add("edit/12 items, 30 lines/the same, early mode", edit_bare, 30, 12, true);
    for (const int lines : {10, 100, 1000, 10000, 100000})
        add("growth/lines/" + std::to_string(lines), edit_ours, lines, 10, false);
    for (const int count : {1, 10, 100, 1000}) {
        add("growth/items/" + std::to_string(count), edit_ours, 1000, count, false);
        add("growth/absent items/" + std::to_string(count), edit_ours, 1000, count, true);
    }
    add("log/syslog/ours", log_ours);
    add("log/syslog/syslog", log_syslog);
    add("stdout/printf/ours", log_ours);
    add("stdout/printf/printf", log_printf);
    add("system/true/ours", system_ours);
    add("system/true/system", system_libc);

    if (getenv("BENCH_STDOUT"))
        vlsys_openlog("bench", 0, -1);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
}
