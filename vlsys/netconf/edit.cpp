#include "netconf/edit.h"

#include "core/log.h"
#include "core/replacement.h"
#include "core/text.h"

#include <cstring>
#include <fcntl.h>
#include <string_view>

namespace vlsys {

namespace {

struct Entry {
    char *line;   // "<key>=<value>\n"
    size_t match; // length of the key and its "="
    bool used;    // has met a line of the old file
    bool removing;
};

struct FreeEntries {
    void operator()(Entry *entries) const {
        for (const Entry *entry = entries; entry->line; ++entry)
            free(entry->line);
        free(entries);
    }
};
// The items with their lines. An entry without a line ends the list.
using WorkingList = std::unique_ptr<Entry[], FreeEntries>;

// A file as a whole.
struct Content {
    Text bytes;
    size_t size = 0;
};

} // namespace

static int make_directory_of(const char *path) {
    const Text directory(strndup(path, VLSYS_PATH_SIZE));
    if (!directory)
        return -errno;
    char *const slash = strrchr(directory.get(), '/');
    if (!slash || slash == directory.get())
        return 0;
    *slash = '\0';
    if (access(directory.get(), F_OK) == 0)
        return 0; // vlsys_mkdir would try every level
    if (vlsys_mkdir(directory.get(), 0755) != 0 && errno != EEXIST)
        return log_errno("%s: vlsys_mkdir(%s, 0755)", "edit", directory.get());
    return 0;
}

static char *make_line(const edit_item &item) {
    auto *const line =
        static_cast<char *>(malloc(strlen(item.key) + strlen(item.value) + sizeof "=\n"));
    if (line)
        stpcpy(stpcpy(stpcpy(stpcpy(line, item.key), "="), item.value), "\n");
    return line;
}

static int build_list(std::span<const edit_item> items, WorkingList *list) {
    const size_t count = items.size() + 1;
    list->reset(static_cast<Entry *>(calloc(count, sizeof(Entry))));
    if (!*list)
        return log_errno("calloc(%d, %d)", static_cast<int>(count),
                         static_cast<int>(sizeof(Entry)));
    Entry *entry = list->get();
    for (const edit_item &item : items) {
        entry->line = make_line(item);
        if (!entry->line)
            return log_errno("asprintf(\"%s=%s\\n\")", item.key, item.value);
        entry->match = strlen(item.key) + 1;
        entry->removing = item.remove == 1;
        ++entry;
    }
    return 0;
}

// A missing file reads as an empty one.
static int open_old(const char *path, Fd *fd) {
    fd->reset(open(path, O_RDONLY | O_CLOEXEC));
    if (*fd)
        return 0;
    if (errno != ENOENT)
        return log_errno("%s: fopen(\"%s\", \"r\")", "edit", path);
    fd->reset(open("/dev/null", O_RDONLY | O_CLOEXEC));
    return *fd ? 0 : log_errno("%s: fopen(\"/dev/null\", \"r\")", "edit");
}

static bool enlarge(Text *bytes, size_t size) {
    auto *const larger = static_cast<char *>(realloc(bytes->get(), size));
    if (!larger)
        return false;
    static_cast<void>(bytes->release());
    bytes->reset(larger);
    return true;
}

static int read_old(const char *path, Content *old) {
    Fd fd;
    const int result = open_old(path, &fd);
    if (result != 0)
        return result;
    size_t capacity = 0;
    ssize_t length = 0;
    do {
        old->size += static_cast<size_t>(length);
        if (old->size == capacity) {
            capacity = capacity == 0 ? 8192 : 2 * capacity;
            if (!enlarge(&old->bytes, capacity))
                return log_errno("%s: getline(%s)", "edit", path);
        }
        length =
            TEMP_FAILURE_RETRY(read(fd.get(), old->bytes.get() + old->size, capacity - old->size));
    } while (length > 0);
    // A directory reads as empty: nothing takes its place, the rename says so.
    if (length < 0 && errno != EISDIR)
        return log_errno("%s: getline(%s)", "edit", path);
    return 0;
}

// Takes the first line, with its line feed where it has one, from the text.
static std::string_view take_line(std::string_view *text) {
    const size_t feed = text->find('\n');
    const std::string_view line(text->data(), feed < text->size() ? feed + 1 : text->size());
    text->remove_prefix(line.size());
    return line;
}

// The first unused entry that the line belongs to; null when there is none.
static Entry *find_entry(const WorkingList &list, std::string_view line) {
    for (Entry *entry = list.get(); entry->line; ++entry)
        // Most keys differ in their first letter, which spares a call.
        if (!entry->used && line[0] == entry->line[0] &&
            starts_with(line, {entry->line, entry->match}))
            return entry;
    return nullptr;
}

static int write_new(std::string_view old, const WorkingList &list, Replacement *replacement) {
    bool in_line = false; // the line written last has no line feed
    int result = 0;
    while (result == 0 && !old.empty()) {
        std::string_view line = take_line(&old);
        if (line[0] == '\n' || line[0] == '#')
            continue;
        if (Entry *const entry = find_entry(list, line)) {
            entry->used = true;
            if (entry->removing)
                continue;
            line = entry->line;
        }
        in_line = line.back() != '\n';
        result = replacement->write(line);
    }
    for (const Entry *entry = list.get(); result == 0 && entry->line; ++entry) {
        if (entry->used || entry->removing)
            continue;
        if (in_line)
            result = replacement->write("\n");
        in_line = false;
        if (result == 0)
            result = replacement->write(entry->line);
    }
    return result;
}

int edit(const char *path, const edit_item *items, uint32_t count) {
    if (!path || !items)
        return -EFAULT;
    WorkingList list;
    Replacement replacement;
    Content old;
    int result = make_directory_of(path);
    if (result == 0)
        result = build_list({items, count}, &list);
    if (result == 0)
        result = replacement.create(path, '-');
    if (result == 0)
        result = read_old(path, &old);
    if (result == 0)
        result = write_new({old.bytes.get(), old.size}, list, &replacement);
    if (result == 0)
        result = replacement.commit();
    if (result == 0)
        result = replacement.set_mode();
    return result;
}

int edit_or_log(const char *path, std::span<const edit_item> items) {
    const int result = edit(path, items.data(), static_cast<uint32_t>(items.size()));
    if (result < 0)
        vlsys_log(LOG_ERR, "edit(%s): failed", path);
    return result;
}

} // namespace vlsys
