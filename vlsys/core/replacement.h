// Whole-file replacement: a reader sees the old file or the new one, never a part of either.
#pragma once

#include "core/owners.h"

#include <string_view>

namespace vlsys {

enum class Flush { none, to_disk };

// One file on its way to take another's place. Each step returns 0, or the negated errno after
// logging its message. A temporary that was not committed is removed with its owner.
class Replacement {
  public:
    Replacement() = default;
    Replacement(const Replacement &) = delete;
    Replacement &operator=(const Replacement &) = delete;
    ~Replacement();

    // Makes the temporary "<path><separator>XXXXXX", mode 0600. The path must outlive this owner.
    int create(const char *path, char separator);
    // Opens the stream to the temporary.
    int open();
    // Writes bytes to the stream. They must stay valid until the next write or the commit, whose
    // message shows them when the stream cannot be flushed.
    int write(std::string_view bytes);
    // Puts the new content in place of the old.
    int commit(Flush flush);
    // Sets the mode of the file in place to 0644.
    int set_mode() const;

  private:
    int write_failed() const;

    const char *path_ = nullptr;
    Text temporary_; // name of the temporary while it exists
    Fd fd_;
    File stream_;
    std::string_view last_;
};

} // namespace vlsys
