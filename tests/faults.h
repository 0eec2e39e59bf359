// Faults: any call that the library itself makes can fail, or be the one that its process does not
// live to make. The linker puts the calls that faults.cpp lists in the library's way (--wrap).
#pragma once

#include <array>

namespace test {

enum class Fault {
    none,
    copy_etc, // no fault: /etc is copied into /run/versions after each call of rename
    failure,  // the call fails; it counts once for each way to fail
    kill,     // the process is killed before the call
    power_cut // the same, and no replaced file keeps what was not flushed to the disk
};

// What happened; kept in shared memory, so that it outlives the process.
struct Strike {
    char call[16];   // its name; "" when there was no such call
    int error;       // its errno
    bool must_retry; // it was interrupted, or cannot be done at all: nobody shall notice
    int held;        // taken from the system so far, and not given back
};

// From now on to end_faults this thread's nth call (1 is the next one) is struck.
void begin_faults(Fault fault, int nth, Strike *strike);
// A power cut that found no call any more cuts here.
void end_faults();

// What stands in a call's way (see CMakeLists.txt). Arguments and results go through as machine
// words, whatever their types are; a call has seven at most.
using Word = long;
using Function = Word(Word, Word, Word, Word, Word, Word, Word);
Word intercept(const char *name, Function *real, const std::array<Word, 7> &arguments);

} // namespace test
