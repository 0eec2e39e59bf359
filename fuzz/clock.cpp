// Any clock file, rewritten for a zone and read back.
#include "fuzz.h"

static std::string rewrite(const std::string &clock) {
    const std::string path = scratch("etc/sysconfig/clock");
    std::ofstream(path) << clock;
    files["clock"] = clock;
    CHECK(vlsys_set_timezone("Etc/GMT") == 0);
    return files["clock"] = read_file(path);
}

static void feed(const std::string &text) {
    setenv("VL_ROOT", scratch("").c_str(), 1);
    CHECK(vlsys_init() == 0);
    CHECK(vlsys_mkdir(scratch("etc/sysconfig").c_str(), 0755) == 0);
    const std::string rewritten = rewrite(text);
    CHECK(rewritten.find("ZONE=\"Etc/GMT\"\n") != std::string::npos);
    if (text.find("ZONE=") == std::string::npos)
        CHECK(rewritten.starts_with(text));
    char zone[80];
    CHECK(vlsys_get_timezone(zone, sizeof zone) == 7 && strcmp(zone, "Etc/GMT") == 0);
    CHECK(rewrite(rewritten) == rewritten);
}
