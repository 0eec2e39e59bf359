// The kinds of unit that a person or a test can choose from.
#pragma once

#include <string>

namespace unit {

struct Board {
    static constexpr int missing = -1;

    int config = 0;
    int alive = 0x01; // 0: not alive
};

struct Kind {
    const char *name;
    const char *description;
    bool surrogate = true; // the surrogate parent runs
    bool serial = true;    // the serial number can be read
    bool driver = true;    // the video I/O driver is loaded
    Board krd31 = {};
    Board tbx204 = {};
    Board tbx205 = {};
    Board tbx206 = {};
};

extern const Kind kinds[];
extern const Kind *const kinds_end;

// Null when there is no such kind.
const Kind *find_kind(const char *name);
// The text of the driver's status file.
std::string driver_status(const Kind &kind);

} // namespace unit
