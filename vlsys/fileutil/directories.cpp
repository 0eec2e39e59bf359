#include "core/log.h"
#include "core/owners.h"

#include <cstring>
#include <fts.h>
#include <sys/stat.h>

namespace vlsys {

static int make_level(const char *path, unsigned int mode) {
    if (mkdir(path, mode) == 0 || errno == EEXIST)
        return 0;
    return log_errno("mkdir(%s, %04o)", path, mode);
}

namespace {

struct CloseWalk {
    const char *path;

    void operator()(FTS *walk) const {
        if (fts_close(walk) != 0)
            log_errno("fts_close: %s", path);
    }
};
using Walk = std::unique_ptr<FTS, CloseWalk>;

} // namespace

// The walk changes the working directory: calls take fts_accpath, messages fts_path.
static int remove_file(const FTSENT *entry) {
    return unlink(entry->fts_accpath) == 0 ? 0 : log_errno("unlink %s", entry->fts_path);
}

static int remove_directory(const FTSENT *entry) {
    return rmdir(entry->fts_accpath) == 0 ? 0 : log_errno("rmdir %s", entry->fts_path);
}

// 0, or the negated errno of a failed removal.
static int visit(FTS *walk, FTSENT *entry) {
    switch (entry->fts_info) {
    case FTS_D:
    case FTS_DNR:
        return 0;
    case FTS_DC:
        vlsys_log(LOG_WARNING, "circular directory structure: %s", entry->fts_path);
        fts_set(walk, entry, FTS_SKIP);
        return 0;
    case FTS_DEFAULT:
    case FTS_F:
    case FTS_NS:
    case FTS_NSOK:
    case FTS_SL:
    case FTS_SLNONE:
        return remove_file(entry);
    case FTS_DP:
        return remove_directory(entry);
    case FTS_ERR:
        vlsys_log(LOG_ERR, "traversal failed: %s: %s", entry->fts_path, strerror(entry->fts_errno));
        fts_set(walk, entry, FTS_SKIP);
        return 0;
    default:
        vlsys_log(LOG_ERR, "unspected failure: fts_info=%d: %s", entry->fts_info, entry->fts_path);
        return 0;
    }
}

// The path without slashes at its end, which would follow a link.
static Text without_slashes(const char *path) {
    size_t length = strlen(path);
    while (length > 1 && path[length - 1] == '/')
        length--;
    Text copy(strndup(path, length));
    if (!copy)
        log_errno("strndup(%s, %d)", path, static_cast<int>(length));
    return copy;
}

// The next entry; null at the end, with errno 0, and when the walk failed.
static FTSENT *next_entry(FTS *walk) {
    errno = 0;
    return fts_read(walk);
}

// Returns 0, or the negated errno of what ended the work, logged.
static int remove_tree(const char *path) {
    const Text root = without_slashes(path);
    if (!root)
        return -errno;
    char *const roots[] = {root.get(), nullptr};
    const Walk walk(fts_open(roots, FTS_NOSTAT | FTS_PHYSICAL | FTS_XDEV, nullptr),
                    CloseWalk{path});
    if (!walk)
        return log_errno("fts_open  %s", path);
    while (FTSENT *entry = next_entry(walk.get())) {
        const int result = visit(walk.get(), entry);
        if (result < 0)
            return result;
    }
    return errno == 0 ? 0 : log_errno("fts_read %s", path);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_mkdir(const char *path, unsigned int mode) {
    const Text copy(strndup(path, VLSYS_PATH_SIZE));
    if (!copy) {
        log_errno("strndup(%s, %d)", path, VLSYS_PATH_SIZE);
        return -1;
    }
    char *const start = copy.get()[0] == '/' ? copy.get() + 1 : copy.get();
    for (char *slash = strchr(start, '/'); slash; slash = strchr(slash + 1, '/')) {
        *slash = '\0';
        if (make_level(copy.get(), mode) < 0)
            return -1;
        *slash = '/';
    }
    return make_level(copy.get(), mode) < 0 ? -1 : 0;
}

int vlsys_remove_tree(const char *path) {
    if (!path)
        return EFAULT;
    if (path[0] == '\0')
        return ENOENT;
    return -remove_tree(path);
}
