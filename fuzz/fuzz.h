// A target feeds a text from outside to the library and checks what holds for any text.
#pragma once

#include "vlsys.h"

#include <cstdlib>
#include <sstream>
#include <syslog.h>
#include <vector>

#define CHECK(condition) ((condition) ? void() : abort())

static void feed(const std::string &text); // the target's own

inline std::vector<std::string> lines_of(const std::string &text) {
    std::istringstream stream(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

// NOLINTNEXTLINE(misc-definitions-in-headers): a target is one source file
extern "C" int LLVMFuzzerTestOneInput(const char *data, size_t size) {
    vlsys_setlogmask(LOG_MASK(LOG_EMERG));
    feed({data, size});
    return 0;
}
