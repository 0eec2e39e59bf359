#include "fileutil/block_device.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"

#include <cinttypes>
#include <cstring>

namespace vlsys {

// The size in bytes that the first line tells in sectors, 0 without a line, or the negated errno
// (not logged).
static int64_t read_block_size(FILE *file) {
    constexpr int64_t sector_size = 512;
    constexpr int64_t sector_limit = INT64_MAX / sector_size;
    char line[64];
    const int result = read_line(file, line, sizeof line);
    if (result <= 0)
        return result;
    const unsigned long long sectors = strtoull(line, nullptr, 10);
    return sectors < sector_limit ? static_cast<int64_t>(sectors) * sector_size : INT64_MAX;
}

int64_t read_block_size_file(const char *path) {
    File file(fopen(path, "re"));
    if (!file)
        return log_errno("fopen(%s)", path);
    const int64_t size = read_block_size(file.get());
    if (size < 0)
        return log_errno("fgets(%s)", path);
    file.reset();
    vlsys_log(LOG_INFO, "%s: %" PRId64, path, size);
    return size;
}

// "sda1" and "hdb2": a partition of a disk with a one-letter name.
static bool is_partition(const char *name) {
    return strlen(name) > 3 && (name[0] == 'h' || name[0] == 's') && name[1] == 'd' &&
           name[3] >= '0' && name[3] <= '9';
}

} // namespace vlsys

using namespace vlsys;

int64_t vlsys_get_block_device_size(const char *path) {
    if (!path)
        return -EFAULT;
    char resolved[VLSYS_PATH_SIZE] = "";
    const int64_t length = vlsys_realpath(resolved, path, sizeof resolved);
    if (length == 0)
        return -ENOENT;
    if (length < 0)
        return length;

    const char *const slash = strrchr(resolved, '/');
    const char *const base = slash ? slash + 1 : resolved;
    const Text name(strndup(base, VLSYS_PATH_SIZE));
    if (!name)
        return log_errno("strndup(%s, %d)", base, VLSYS_PATH_SIZE);
    vlsys_log(LOG_DEBUG, "dev: %s", name.get());

    char file[VLSYS_PATH_SIZE + sizeof block_path + sizeof "/sda//size"];
    if (is_partition(name.get()))
        snprintf(file, sizeof file, "%s/%.3s/%.*s/size", block_path, name.get(), VLSYS_PATH_SIZE,
                 name.get());
    else
        snprintf(file, sizeof file, "%s/%s/size", block_path, name.get());
    return read_block_size_file(file);
}
