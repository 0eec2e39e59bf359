// The peers made of bare system calls: what the library can't do without, and nothing else.
#pragma once

#include <string>

// Replaces the file as `edit` does, with a content that is ready; with `early_mode` it gives the
// mode before the rename too, so that a kill between them leaves no file that its readers can't
// open.
bool replace_bare(const char *path, const std::string &content, bool early_mode);

// Removes a tree: openat, getdents, unlinkat.
bool remove_bare(const char *path);
