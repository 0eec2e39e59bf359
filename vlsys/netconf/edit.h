// The one writer of sysconfig files.
#pragma once

#include <cstdint>
#include <span>

namespace vlsys {

// What to do with one key. All zero but for key and value: set it.
struct edit_item {
    uint32_t remove; // 1: remove the key; any other value: set it
    const char *key;
    const char *value; // written as it is, without quotes
};

// Rewrites the sysconfig file, applying the items in order; a missing file counts as empty, its
// directory is made. Each item acts on the first line of its key that no earlier item took; keys to set
// that the file lacks are appended. Comments and empty lines are dropped, every other line is kept byte for byte.
// Returns 0, -14 for a null path or item array (silent), else the negated errno of the failed call, logged.
int edit(const char *path, const edit_item *items, uint32_t count);

// `edit`, with "edit(%s): failed" logged on failure; returns 0 or the positive errno.
int edit_or_log(const char *path, std::span<const edit_item> items);

} // namespace vlsys
