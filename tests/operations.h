// Every public operation that touches a file, the kernel, memory or a socket; of two forms one.
#pragma once

#include "records.h"

#include <functional>
#include <ostream>
#include <vector>

namespace test {

extern const Records given; // what each operation is given; readers write over it

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

// Gives the operations what they need: addresses and routes, and a disk.
void prepare_operations();
// Puts the files that they read and change back in place.
void reset_files();

int check_one(Records &r);
int check_both(Records &r);
int set_network(Records &r);

} // namespace test
