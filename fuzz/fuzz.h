// A target feeds outside text to the library and asserts what must hold for any text.
#pragma once

#include "core/owners.h"
#include "vlsys.h"
#include <algorithm>
#include <arpa/inet.h>
#include <array>
#include <cassert>
#include <cstring>
#include <fstream>
#include <map>
#include <sstream>

using Input = std::array<std::string, 16>; // an input's pieces, which form feeds separate
static void check(Input &in);              // the target's own

inline const std::string scratch = getenv("TMPDIR") ? getenv("TMPDIR") : "/dev/shm";
inline std::map<std::string, std::string> files; // by name, what fopen finds on any path
inline std::string read_file(const std::string &path) {
    return {std::istreambuf_iterator<char>(std::ifstream(path).rdbuf()), {}};
}
inline bool has(const std::string &text, const std::string &part) {
    return text.find(part) != text.npos;
}
template <class Record>
std::string bytes_of(const Record &record) {
    return {reinterpret_cast<const char *>(&record), sizeof record};
}

extern "C" {
int LLVMFuzzerTestOneInput(const char *data, size_t size) {
    Input in;
    std::istringstream text({data, size});
    for (std::string &piece : in)
        std::getline(text, piece, '\f');
    return check(in), 0;
}
FILE *__real_fopen(const char *path, const char *mode);
FILE *__wrap_fopen(const char *path, const char *mode) {
    const auto file = files.find(basename(path));
    return file == files.end() ? __real_fopen(path, mode)
                               : fmemopen(file->second.data(), file->second.size(), "r");
}
void __wrap_syslog(...) {}
}
