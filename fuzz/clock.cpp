// The clock file, rewritten for a zone with a name of any length, and read.
#include "fuzz.h"

static std::string rewritten(const std::string &zone, const std::string &clock) {
    files["clock"] = clock;
    assert(vlsys_set_timezone(zone.c_str()) == 0);
    return files["clock"] = read_file(scratch + "/etc/sysconfig/clock");
}

static void check(Input &in) {
    static const int ready [[maybe_unused]] =
        setenv("VL_ROOT", scratch.c_str(), 1) | vlsys_init() |
        vlsys_mkdir((scratch + "/etc/sysconfig").c_str(), 0755);
    std::string zone = "Etc/GMT";
    std::string expected;
    for (size_t i = in[1].size() % 48; i > 0; i--)
        zone.insert(0, "./");
    const std::string line = "ZONE=\"" + zone + "\"\n";
    bool found = false;
    for (size_t at = 0, size = 0; at < in[0].size(); at += size) {
        size = std::min({78UL, in[0].find('\n', at) - at, in[0].size() - 1 - at}) + 1;
        const std::string piece = in[0].substr(at, size);
        expected += has(piece, "ZONE=") ? line.substr(0, 79) : piece;
        found |= has(piece, "ZONE=");
    }
    if (!found)
        expected += (expected.empty() || expected.back() == '\n' ? "" : "\n") + line;
    assert(rewritten(zone, in[0]) == expected && rewritten(zone, expected) == expected);
    char name[80];
    assert(vlsys_get_timezone(name, sizeof name) > 6 && name == zone.substr(0, 73));
}
