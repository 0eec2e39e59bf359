// Calls of the library, and of the C library beside them. bench.py runs one benchmark at a time, in
// a directory that it made, inside a unit where the call needs one.
#include "netconf/edit.h"
#include "vlsys.h"

#include <benchmark/benchmark.h>

#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <string>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>
#include <vector>

using benchmark::State;

namespace {

// Ends at the first failure.
template <class Call>
void measure(State &state, Call call) {
    for (auto _ : state)
        if (!call()) {
            state.SkipWithError("failed");
            return;
        }
}

// ---- Edit

const char *const directories[] = {"etc", "etc/sysconfig", "etc/sysconfig/network-scripts"};
const char *const path = "etc/sysconfig/network-scripts/ifcfg-eth0";

// Keys that mostly differ in their first letter, as those of the unit do.
std::string key(size_t i) {
    return static_cast<char>('A' + i % 26) + ("_KEY" + std::to_string(i));
}

// Makes the file; returns its content.
std::string make_file(size_t lines) {
    std::string content;
    for (size_t i = 0; i < lines; i++)
        content += key(i) + "=some-value-of-a-usual-length\n";
    for (const char *const directory : directories)
        mkdir(directory, 0755);
    std::ofstream(path) << content;
    return content;
}

// Sets some keys of the file, evenly spread, to what they are.
void edit(State &state, uint32_t lines, uint32_t count) {
    make_file(lines);
    std::vector<std::string> keys(count);
    std::vector<vlsys::edit_item> items(count);
    for (uint32_t i = 0; i < count; i++) {
        keys[i] = key(i * lines / count);
        items[i] = {.remove = 0, .key = keys[i].c_str(), .value = "some-value-of-a-usual-length"};
    }
    measure(state, [&] { return vlsys::edit(path, items.data(), count) == 0; });
}

// The system calls of such an edit, and nothing else. Where the edit makes a call more, it belongs
// here too: `scripts/bench edit` says which calls differ.
bool replace(const std::string &content) {
    if (access(std::end(directories)[-1], F_OK) != 0)
        return false;
    std::string temporary = std::string(path) + "-XXXXXX";
    const mode_t mask = umask(077);
    const int made = mkostemp(temporary.data(), O_CLOEXEC);
    umask(mask);

    char buffer[8192];
    const int old = open(path, O_RDONLY | O_CLOEXEC);
    while (read(old, buffer, sizeof buffer) > 0)
        continue;
    close(old);

    const bool written = write(made, content.data(), content.size()) > 0;
    getxattr(path, "security.selinux", buffer, sizeof buffer);
    const bool flushed = fchmod(made, 0644) == 0 && fsync(made) == 0 && close(made) == 0;
    return written && flushed && rename(temporary.c_str(), path) == 0 && chmod(path, 0644) == 0;
}

void edit_bare(State &state, size_t lines) {
    const std::string content = make_file(lines);
    measure(state, [&] { return replace(content); });
}

// ---- Validators

// A valid setting of eth0 and the interfaces after it. The validators leave it as it is once they
// have brought it into form. They log faults alone, and the peer nothing.
struct Setting {
    explicit Setting(size_t count) : nifs(count) {
        vlsys_setlogmask(LOG_UPTO(LOG_WARNING));
        for (size_t i = 0; i < count; i++) {
            vlsys_ifconf &nif = nifs[i];
            snprintf(nif.name, sizeof nif.name, "eth%zu", i);
            snprintf(nif.addr, sizeof nif.addr, "10.%zu.%zu.2", i / 256 % 256, i % 256);
            snprintf(nif.netmask, sizeof nif.netmask, "24");
            nif.prefix = 24;
            nif.ipv4_mode = VLSYS_MODE_MANUAL;
            snprintf(nif.addr6[0].addr, sizeof nif.addr6[0].addr, "fd00:%zx::2", i);
            nif.addr6[0].prefix = 64;
            nif.ipv6_mode = VLSYS_MODE_MANUAL;
        }
    }

    std::vector<vlsys_ifconf> nifs;
    vlsys_gw4 gw4 = {.iface = "", .addr = "10.0.0.1", .mode = VLSYS_MODE_MANUAL};
    vlsys_gw6 gw6 = {.iface = "", .addr = "fd00:0::1", .mode = VLSYS_MODE_MANUAL};
    vlsys_dns dns = {.domain = "example.org",
                     .server = {"10.0.0.3", "10.0.0.4", ""},
                     .iface = "",
                     .mode = VLSYS_MODE_MANUAL};
    char hostname[VLSYS_HOSTNAME_SIZE] = "rhx416-41600123";
};

void check(State &state) {
    Setting s(1);
    measure(state, [&] {
        return vlsys_address_check(s.nifs.data(), s.gw4.addr, s.gw6.addr, &s.dns, s.hostname) == 0;
    });
}

void check2(State &state, int count) {
    Setting s(static_cast<size_t>(count));
    measure(state, [&] {
        return vlsys_address_check2(s.nifs.data(), count, &s.gw4, &s.gw6, &s.dns, s.hostname) == 0;
    });
}

// ---- Readers

void get_netif(State &state) {
    vlsys_ifconf nif = {};
    measure(state, [&] {
        return vlsys_get_netif("eth0", &nif) == 0 && strcmp(nif.addr, "192.168.1.2") == 0;
    });
}

void get_gateway(State &state) {
    vlsys_gw4 gw4 = {};
    measure(state, [&] {
        return vlsys_get_ipv4_default_gateway2(&gw4) == 0 && strcmp(gw4.addr, "192.168.1.1") == 0;
    });
}

// ---- Log, removal, commands

// In system log mode, or, opened for it, in standard-output mode.
void log_ours(State &state) {
    for (auto _ : state)
        vlsys_log(LOG_INFO, "IPv4 (%s): %s/%d", "eth0", "192.168.10.20", 24);
}

// The same line.
void log_syslog(State &state) {
    for (auto _ : state)
        syslog(LOG_INFO, "[%d]: IPv4 (%s): %s/%d", gettid(), "eth0", "192.168.10.20", 24);
}

void log_stdout(State &state) {
    vlsys_openlog("bench", 0, -1);
    log_ours(state);
}

// The same line.
void log_printf(State &state) {
    for (auto _ : state)
        printf("%s[%d]: <%s>: [%d]: IPv4 (%s): %s/%d\n", "bench", getpid(), "INFO", gettid(),
               "eth0", "192.168.10.20", 24);
}

// The tree is there for one removal.
void remove_tree(State &state) {
    measure(state, [] { return vlsys_remove_tree("tree") == 0; });
}

void system_ours(State &state) {
    vlsys_setlogmask(LOG_UPTO(LOG_WARNING)); // as the peer, which logs nothing
    measure(state, [] { return vlsys_system("true") == 0; });
}

void system_libc(State &state) {
    measure(state, [] { return system("true") == 0; });
}

} // namespace

BENCHMARK_CAPTURE(edit, 30_lines, 30, 12)->UseRealTime();
BENCHMARK_CAPTURE(edit_bare, 30_lines, 30)->UseRealTime();
BENCHMARK_CAPTURE(edit, 1000_lines, 1000, 10)->UseRealTime();
BENCHMARK_CAPTURE(edit, 10000_lines, 10000, 10)->UseRealTime();
BENCHMARK_CAPTURE(edit, 100_keys, 1000, 100)->UseRealTime();
BENCHMARK(check)->UseRealTime();
BENCHMARK_CAPTURE(check2, 2, 2)->UseRealTime();
BENCHMARK_CAPTURE(check2, 64, 64)->UseRealTime();
BENCHMARK(get_netif)->UseRealTime();
BENCHMARK(get_gateway)->UseRealTime();
BENCHMARK(remove_tree)->Iterations(1)->UseRealTime();
BENCHMARK(log_ours)->UseRealTime();
BENCHMARK(log_syslog)->UseRealTime();
BENCHMARK(log_stdout)->UseRealTime();
BENCHMARK(log_printf)->UseRealTime();
BENCHMARK(system_ours)->UseRealTime();
BENCHMARK(system_libc)->UseRealTime();
BENCHMARK_MAIN();
