#include "core/replacement.h"

#include "core/log.h"
#include "core/text.h"

#include <fcntl.h>

namespace vlsys {

Replacement::~Replacement() {
    const SavedErrno caller;
    stream_.reset();
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

int Replacement::open() {
    stream_.reset(fdopen(fd_.get(), "w"));
    if (!stream_) {
        vlsys_log(LOG_ERR, "%s: %m", "fdopen(fd, \"w\")");
        return -errno;
    }
    fd_.release();
    return 0;
}

int Replacement::write(std::string_view bytes) {
    last_ = bytes;
    if (fwrite(bytes.data(), 1, bytes.size(), stream_.get()) != bytes.size())
        return write_failed();
    return 0;
}

int Replacement::write_failed() const {
    vlsys_log(LOG_ERR, "fputs(%.*s): %m", static_cast<int>(last_.size()), last_.data());
    return -errno;
}

int Replacement::commit(Flush flush) {
    if (fflush(stream_.get()) != 0)
        return write_failed();
    // A process killed right after the rename leaves the mode that the file has now.
    fchmod(fileno(stream_.get()), 0644);
    if (flush == Flush::to_disk && fsync(fileno(stream_.get())) != 0) {
        vlsys_log(LOG_ERR, "fsync(%s): %m", temporary_.get());
        return -errno;
    }
    stream_.reset();
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
