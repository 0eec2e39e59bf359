// Owners: each releases what it holds when it goes out of scope, on every path.
#pragma once

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <netdb.h>
#include <unistd.h>

namespace vlsys {

// Puts errno back to what it was when the guard was made.
class SavedErrno {
  public:
    SavedErrno() : value_(errno) {}
    SavedErrno(const SavedErrno &) = delete;
    SavedErrno &operator=(const SavedErrno &) = delete;
    ~SavedErrno() { errno = value_; }

    int value() const { return value_; }

  private:
    int value_;
};

struct Free {
    void operator()(void *memory) const { free(memory); }
};

// Text or array from malloc, strdup, asprintf, calloc.
template <class T>
using Owned = std::unique_ptr<T, Free>;
using Text = Owned<char>;

// Closing keeps errno: an owner closes on the way out, when errno says why.
struct CloseFile {
    void operator()(FILE *file) const {
        const SavedErrno reason;
        fclose(file);
    }
};
using File = std::unique_ptr<FILE, CloseFile>;

struct FreeAddresses {
    void operator()(addrinfo *list) const { freeaddrinfo(list); }
};
using AddressList = std::unique_ptr<addrinfo, FreeAddresses>; // from getaddrinfo

class Fd {
  public:
    explicit Fd(int fd = -1) : fd_(fd) {}
    Fd(const Fd &) = delete;
    Fd &operator=(const Fd &) = delete;
    ~Fd() { reset(); }

    int get() const { return fd_; }
    explicit operator bool() const { return fd_ >= 0; }

    int release() {
        const int fd = fd_;
        fd_ = -1;
        return fd;
    }

    void reset(int fd = -1) {
        const SavedErrno reason;
        if (fd_ >= 0)
            close(fd_);
        fd_ = fd;
    }

  private:
    int fd_;
};

} // namespace vlsys
