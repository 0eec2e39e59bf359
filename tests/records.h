// The records that the operations and the settings of the tests are made of.
#pragma once

#include "vlsys.h"

#include <cstring>
#include <map>
#include <string>

namespace test {

struct Records {
    char text[VLSYS_PATH_SIZE];
    vlsys_ifconf nifs[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    time_t time;
    int step;
};

// A text, or a number of one or four bytes.
struct Field {
    template <class Member>
    Field(Member &member) : at(reinterpret_cast<char *>(&member)), size(sizeof member) {}
    bool is_number() const { return size <= sizeof(uint32_t); }
    std::string value() const { return {at, is_number() ? size : strnlen(at, size)}; }

    char *at;
    size_t size;
};

// By the names that tables use; those of eth0 have no prefix.
std::map<std::string, Field> fields_of(Records &records);

// A setting that passes, with these changes. eth0 has fixed addresses of both families; eth1 is
// off, but has addresses to be switched on.
Records make(const std::string &changes);

} // namespace test
