// Sizes of disks and partitions.
#pragma once

#include <cstdint>
#include <cstdio>

namespace vlsys {

// The size in bytes that an open size file of /sys/block tells: its first line, in sectors.
int64_t read_block_size(FILE *file);
// The same of a file given by its path, with its messages; the negated errno when it cannot be
// opened.
int64_t read_block_size_file(const char *path);

} // namespace vlsys
