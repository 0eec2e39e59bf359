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

// What an operation returns when one of its calls fails.
enum class Failure {
    never,          // it always returns its good result
    errno_value,    // the call's errno
    errno_or_enxio, // the same, but ENXIO when the interfaces cannot be listed
    negative_errno, // the same, negated
    minus_one,      // -1
    zero,           // 0
    mixed           // errno_value, negative_errno or minus_one, as the step has it
};

enum class Trait { none, starts_library, logs_nothing };

struct Operation {
    const char *name;
    long good; // its result when all is well
    Failure failure;
    const char *replaces; // the names of the files that it changes, "" for none
    // The calls whose failure leaves it with the good result, and less done or read.
    const char *passes_over;
    std::function<long(Records &)> run;
    Trait trait = Trait::none;
};

extern const std::vector<Operation> operations;
void PrintTo(const Operation &operation, std::ostream *stream); // its name, in test reports

// Around them: two interfaces with addresses and routes, and the files, afresh. They need a
// surrogate parent that answers 0 to everything.
void prepare_operations();
void reset_files();

} // namespace test
