// Faults: any call that the library itself makes can fail, or be the one before which the process
// is killed. The linker leads the calls that faults.cpp lists to `intercept` below (--wrap).
#pragma once

#include <array>
#include <string>

namespace test {

enum class Fault {
    none,
    copy_etc, // no fault: /etc is copied into /run/versions after each call of rename
    failure,  // the call fails; it counts once for each way to fail
    kill,     // the process is killed before the call
    power_cut // the same, and no replaced file keeps what was not flushed to the disk
};

// What happened, all zeros before; kept in shared memory, so that it outlives the process.
struct Strike {
    char call[16];          // its name; "" when there was no such call
    int error;              // the errno it failed with
    bool must_go_unnoticed; // whether the operation has to make this failure good
    int held;               // how many things were acquired so far and not released
};

// Between these two, this thread's nth call (1 is the next one) is struck. When a power cut has
// found no nth call, end_faults cuts the power.
void begin_faults(Fault fault, int nth, Strike *strike);
void end_faults();

bool has_word(const std::string &words, const std::string &word);

// Called in place of a listed call (see CMakeLists.txt). Arguments and results go through as
// machine words, whatever their types are; a call has at most seven arguments.
using Word = long;
using Function = Word(Word, Word, Word, Word, Word, Word, Word);
Word intercept(const char *name, Function *real, const std::array<Word, 7> &arguments);

} // namespace test
