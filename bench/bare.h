// The peers made of bare system calls: what the library can't do without, and nothing else.
#pragma once

#include <string>

// Replaces the file as `edit` does, with a content that is ready.
bool replace_bare(const char *path, const std::string &content);

// Removes a tree: openat, getdents, unlinkat.
bool remove_bare(const char *path);
