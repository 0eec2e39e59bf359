#include "core/replacement.h"

#include "core/log.h"
#include "core/text.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <utility>

namespace vlsys {

Replacement::~Replacement() {
    const SavedErrno caller;
    fd_.reset();
    if (temporary_)
        unlink(temporary_.get());
}

int Replacement::create(const char *path, char separator) {
    path_ = path;
    Text name = format_text("%s%cXXXXXX", path, separator);
    if (!name)
        return log_errno("asprintf(\"%%s%cXXXXXX\", %s)", separator, path);
    fd_.reset(mkostemp(name.get(), O_CLOEXEC)); // mode 0600, whatever the umask
    if (!fd_)
        return log_errno("mkstemp(%s)", name.get());
    temporary_ = std::move(name);
    return 0;
}

static int write_failed(std::string_view bytes) {
    return log_errno("fputs(%.*s)", static_cast<int>(std::min<size_t>(bytes.size(), INT_MAX)),
                     bytes.data());
}

int Replacement::write(std::string_view bytes) {
    if (bytes.size() > sizeof buffer_ - pending_ && !flush())
        return write_failed(bytes);
    if (bytes.size() > sizeof buffer_)
        return write_all(bytes) ? 0 : write_failed(bytes);
    last_ = {buffer_ + pending_, bytes.size()};
    memcpy(buffer_ + pending_, bytes.data(), bytes.size());
    pending_ += bytes.size();
    return 0;
}

bool Replacement::flush() {
    const size_t length = std::exchange(pending_, 0);
    return write_all({buffer_, length});
}

bool Replacement::write_all(std::string_view bytes) const {
    while (!bytes.empty()) {
        const ssize_t length = TEMP_FAILURE_RETRY(::write(fd_.get(), bytes.data(), bytes.size()));
        if (length == 0)
            errno = EIO; // who takes nothing would be asked for ever
        if (length <= 0)
            return false;
        bytes.remove_prefix(static_cast<size_t>(length));
    }
    return true;
}

// Where files carry security labels, one without its own may be closed to those who need it.
void Replacement::keep_security_label() const {
    static constexpr char name[] = "security.selinux";
    char label[4096]; // the longest that the kernel gives a file
    const ssize_t size = getxattr(path_, name, label, sizeof label);
    if (size > 0 && fsetxattr(fd_.get(), name, label, static_cast<size_t>(size), 0) != 0)
        log_errno("fsetxattr(%s, %s)", temporary_.get(), name);
}

// On some file systems there is nothing to flush.
static bool flush_to_disk(int fd) {
    return TEMP_FAILURE_RETRY(fsync(fd)) == 0 || errno == EINVAL || errno == ENOSYS ||
           errno == EOPNOTSUPP;
}

int Replacement::commit() {
    if (!flush())
        return write_failed(last_);
    keep_security_label();
    // A process killed right after the rename leaves the mode that the file has now.
    fchmod(fd_.get(), 0644);
    if (!flush_to_disk(fd_.get()))
        return log_errno("fsync(%s)", temporary_.get());
    // A signal cuts the wait of a close short, but what was flushed is stored.
    if (close(fd_.release()) != 0 && errno != EINTR)
        return log_errno("close(%s)", temporary_.get());
    if (rename(temporary_.get(), path_) != 0)
        return log_errno("rename(%s, %s)", temporary_.get(), path_);
    temporary_.reset();
    return 0;
}

int Replacement::set_mode() const {
    if (chmod(path_, 0644) != 0)
        return log_errno("chmod(%s)", path_);
    return 0;
}

} // namespace vlsys
