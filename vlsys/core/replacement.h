// Whole-file replacement: a reader sees the old file or the new one, never a part of either.
#pragma once

#include "core/owners.h"

#include <string_view>

namespace vlsys {

// One file on its way to take another's place. Each step returns 0, or the negated errno after
// logging its message. A temporary that was not committed is removed with its owner.
class Replacement {
  public:
    // cppcheck-suppress uninitMemberVar // the buffer holds something up to pending_ only
    Replacement() = default;
    Replacement(const Replacement &) = delete;
    Replacement &operator=(const Replacement &) = delete;
    ~Replacement();

    // Makes the temporary "<path><separator>XXXXXX", mode 0600. The path must outlive this owner.
    int create(const char *path, char separator);
    // Writes bytes, such as a line, by way of a buffer.
    int write(std::string_view bytes);
    // Flushes the new content to disk and puts it in place of the old, with its security label.
    int commit();
    // Sets the mode of the file in place to 0644.
    int set_mode() const;

  private:
    bool flush();
    bool write_all(std::string_view bytes) const;
    void keep_security_label() const;

    const char *path_ = nullptr;
    Text temporary_; // name of the temporary while it exists
    Fd fd_;
    char buffer_[8192];
    size_t pending_ = 0;
    std::string_view last_; // written to the buffer
};

} // namespace vlsys
