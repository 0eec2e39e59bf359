// Reading what the unit's command tool tells about it.
#pragma once

#include <cstddef>
#include <cstdio>

namespace vlsys {

// Reads the version listing to its end: the serial number into the buffer of `size` bytes, and the
// number that begins the last line, the command's wait status when the surrogate parent ran it.
// Returns the length of the serial number, 0 when there is none (the buffer is not written then),
// or the negated errno, logged, when the listing cannot be read.
int read_serial_number(FILE *stream, char *buffer, size_t size, int *status);

} // namespace vlsys
