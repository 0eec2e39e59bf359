// Reading text files line by line. A read that a signal interrupts is taken up again.
#pragma once

#include <cstddef>
#include <cstdio>

namespace vlsys {

// The next byte of the file, or EOF at its end and when it cannot be read (see ferror).
int next_byte(FILE *file);

// Reads one line, line feed included, into `line`. A line of `size` bytes or more keeps its first
// size - 1 bytes; the rest is read and dropped, so that no piece of a long line is ever taken for a
// line of its own.
// Returns 1; 0 at the end of the file, and for a directory, which opens as a file does and reads as
// an empty one; the negated errno when the file cannot be read (not logged).
int read_line(FILE *file, char *line, size_t size);

// A KEY=value line, both parts inside the line's own buffer.
struct Setting {
    const char *key;
    const char *value; // "" when the line has none
};

enum class Quotes { keep, remove };

// The next setting of the file: comments and empty lines are skipped, the rest is split at "=".
// Quotes::remove drops a double quote at the start of the value and all from the next one on.
// Returns 1; 0 at the end of the file, and at a line without a key, which ends the reading; the
// negated errno when the file cannot be read (not logged).
int next_setting(FILE *file, char *line, size_t size, Quotes quotes, Setting *setting);

} // namespace vlsys
