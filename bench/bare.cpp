#include "bench/bare.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

bool replace_bare(const char *path, const std::string &content, bool early_mode) {
    static char buffer[1 << 16];
    std::string temporary = std::string(path) + "-XXXXXX";
    const mode_t mask = umask(077);
    const int out = mkostemp(temporary.data(), O_CLOEXEC);
    umask(mask);
    const int in = open(path, O_RDONLY | O_CLOEXEC);
    while (read(in, buffer, sizeof buffer) > 0)
        continue;
    bool good = out >= 0 && in >= 0;
    for (size_t done = 0; good && done < content.size();) {
        const ssize_t written = write(out, content.data() + done, content.size() - done);
        good = written > 0;
        done += static_cast<size_t>(written);
    }
    good = good && (!early_mode || fchmod(out, 0644) == 0) && fsync(out) == 0;
    close(out);
    close(in);
    return good && rename(temporary.c_str(), path) == 0 && chmod(path, 0644) == 0;
}

static bool remove_entries(int directory) {
    struct Entry {
        uint64_t inode;
        int64_t offset;
        unsigned short length;
        unsigned char type;
        char name[1];
    };
    alignas(Entry) char buffer[1 << 15];
    long size = 0;
    while ((size = syscall(SYS_getdents64, directory, buffer, sizeof buffer)) > 0) {
        const Entry *entry = nullptr;
        for (long at = 0; at < size; at += entry->length) {
            entry = reinterpret_cast<const Entry *>(buffer + at);
            if (strcmp(entry->name, ".") == 0 || strcmp(entry->name, "..") == 0)
                continue;
            const bool is_directory = entry->type == DT_DIR;
            if (is_directory) {
                const int inner = openat(directory, entry->name, O_RDONLY | O_DIRECTORY);
                if (inner < 0 || !remove_entries(inner))
                    return false;
                close(inner);
            }
            if (unlinkat(directory, entry->name, is_directory ? AT_REMOVEDIR : 0) != 0)
                return false;
        }
    }
    return size == 0;
}

bool remove_bare(const char *path) {
    const int directory = open(path, O_RDONLY | O_DIRECTORY);
    if (directory < 0 || !remove_entries(directory))
        return false;
    close(directory);
    return rmdir(path) == 0;
}
