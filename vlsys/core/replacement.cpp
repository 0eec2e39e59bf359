#include "core/replacement.h"

#include "core/log.h"
#include "core/text.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <fcntl.h>
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
    if (!name) {
        vlsys_log(LOG_ERR, "asprintf(\"%%s%cXXXXXX\", %s): %m", separator, path);
        return -errno;
    }
    {
        const SavedUmask mask(077);
        fd_.reset(mkostemp(name.get(), O_CLOEXEC));
    }
    if (!fd_) {
        vlsys_log(LOG_ERR, "mkstemp(%s): %m", name.get());
        return -errno;
    }
    temporary_ = std::move(name);
    return 0;
}

static int write_failed(std::string_view bytes) {
    vlsys_log(LOG_ERR, "fputs(%.*s): %m", static_cast<int>(std::min<size_t>(bytes.size(), INT_MAX)),
              bytes.data());
    return -errno;
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
        if (length < 0)
            return false;
        bytes.remove_prefix(static_cast<size_t>(length));
    }
    return true;
}

int Replacement::commit(Flush to) {
    if (!flush())
        return write_failed(last_);
    // A process killed right after the rename leaves the mode that the file has now.
    fchmod(fd_.get(), 0644);
    if (to == Flush::to_disk && fsync(fd_.get()) != 0) {
        vlsys_log(LOG_ERR, "fsync(%s): %m", temporary_.get());
        return -errno;
    }
    fd_.reset();
    if (rename(temporary_.get(), path_) != 0) {
        vlsys_log(LOG_ERR, "rename(%s, %s): %m", temporary_.get(), path_);
        return -errno;
    }
    temporary_.reset();
    return 0;
}

int Replacement::set_mode() const {
    if (chmod(path_, 0644) != 0) {
        vlsys_log(LOG_ERR, "chmod(%s): %m", path_);
        return -errno;
    }
    return 0;
}

} // namespace vlsys
