// Sizes of disks and partitions.
#pragma once

#include <cstdint>

namespace vlsys {

// The size in bytes that a size file of /sys/block tells, or the negated errno when it cannot be
// opened or read; logged.
int64_t read_block_size_file(const char *path);

} // namespace vlsys
