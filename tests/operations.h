// Every public operation that touches a file, the kernel, memory or a socket, for what is tested
// with all of them.
#pragma once

#include "vlsys.h"

#include <functional>
#include <ostream>
#include <vector>

namespace test {

// What an operation reads into.
struct Records {
    char text[VLSYS_PATH_SIZE];
    char names[4][VLSYS_IFNAME_SIZE];
    vlsys_ifconf nifs[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
};

struct Operation {
    const char *name;
    long good; // its result when all is well
    // Its results when a call fails, as the header has them ("errno", "-errno", "ENXIO", a number),
    // and "silent" when it then logs nothing.
    const char *failure;
    std::function<long(Records &)> run;
    // The calls whose failure leaves it with the good result, and less done or read.
    const char *passes_over = "";
};

extern const std::vector<Operation> operations;
void PrintTo(const Operation &operation, std::ostream *stream); // its name, in test reports

// Around them: two interfaces with addresses and routes, and the files, afresh. They need a
// surrogate parent that answers 0 to everything.
void prepare_operations();
void reset_files();

} // namespace test
