// The one writer of sysconfig files.
#pragma once

#include <cstdint>
#include <span>

namespace vlsys {

// What to do with one key. All zero but for key and value: set it.
struct edit_item {
    uint32_t remove; // 1: remove the key; any other value: set it
    const char *key;
    const char *value; // written as it is, without quotes; not null, even where it is not written
};

// Rewrites the sysconfig file as a whole, mode 0644; a missing file counts as empty, its directory
// is made. A line belongs to a key when it begins with the key and "=". Each item acts on the first
// such line that no earlier item took; keys to set that the file lacks are appended in item order.
// Comments and empty lines are dropped, all other lines are kept byte for byte; lines may be of any
// length.
// Returns 0; -14 for a null path or item array (silent); else the negated errno of the failed call,
// logged, with the old file still in place (unless only its mode could not be set).
int edit(const char *path, const edit_item *items, uint32_t count);

// `edit`, with "edit(%s): failed" logged on failure.
int edit_or_log(const char *path, std::span<const edit_item> items);

} // namespace vlsys
