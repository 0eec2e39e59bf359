// The kinds of unit that a person or a test can choose from.
#pragma once

#include <string>

namespace unit {

struct Kind {
    const char *name;
    const char *description;
    bool surrogate; // the surrogate parent runs
    bool serial;    // the serial number can be read
    bool driver;    // the video I/O driver is loaded
    struct {
        int config;
        int alive; // 0: not alive; negative: the board is missing
    } boards[4];
};

extern const Kind kinds[];
extern const Kind *const kinds_end;

// Null when there is no such kind.
const Kind *find_kind(const char *name);
// The text of the driver's status file.
std::string driver_status(const Kind &kind);

} // namespace unit
