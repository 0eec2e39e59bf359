// A target feeds a text from outside to the library and checks what holds for any text.
#pragma once

#include "vlsys.h"

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#define CHECK(condition) check(condition, #condition)

inline void check(bool holds, const char *condition) {
    if (holds)
        return;
    fprintf(stderr, "does not hold: %s\n", condition);
    abort();
}

static void feed(const std::string &text); // the target's own

inline std::map<std::string, std::string> files; // what fopen finds by a path's last part

inline std::string scratch(const std::string &name) {
    const char *const directory = getenv("TMPDIR");
    return std::string(directory ? directory : "/dev/shm") + "/" + name;
}

inline std::string read_file(const std::string &path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
}

inline std::vector<std::string> lines_of(const std::string &text) {
    std::istringstream stream(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

extern "C" {
int LLVMFuzzerTestOneInput(const char *data, size_t size) {
    feed({data, size});
    return 0;
}
FILE *__real_fopen(const char *path, const char *mode);
FILE *__wrap_fopen(const char *path, const char *mode) {
    const auto file = files.find(basename(path));
    if (file == files.end())
        return __real_fopen(path, mode);
    return fmemopen(file->second.data(), file->second.size(), "r");
}
void __wrap_syslog(...) {}
}
