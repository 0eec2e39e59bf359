#include "netconf/edit.h"

#include "core/log.h"
#include "core/replacement.h"
#include "core/text.h"

#include <cstring>
#include <string_view>
#include <utility>

namespace vlsys {

static int make_directory_of(const char *path) {
    const Text directory(strndup(path, VLSYS_PATH_SIZE));
    if (!directory)
        return -errno;
    char *const slash = strrchr(directory.get(), '/');
    if (!slash)
        return 0;
    *slash = '\0';
    if (vlsys_mkdir(directory.get(), 0755) != 0 && errno != EEXIST) {
        vlsys_log(LOG_ERR, "%s: vlsys_mkdir(%s, 0755): %m", "edit", directory.get());
        return -errno;
    }
    return 0;
}

namespace {

// The items with their lines, and which of them have met a line of the old file.
class WorkingList {
  public:
    struct Entry {
        char *line;   // "<key>=<value>\n"; null in the entry that ends the list
        size_t match; // how many bytes of it a line of the key begins with
        bool used;
        bool removing;
    };

    WorkingList() = default;
    WorkingList(const WorkingList &) = delete;
    WorkingList &operator=(const WorkingList &) = delete;
    ~WorkingList();

    int build(std::span<const edit_item> items);
    // Takes the first unused entry that the line belongs to; null when there is none.
    const Entry *take(std::string_view line);
    const Entry *begin() const { return entries_.get(); }

  private:
    Owned<Entry[]> entries_;
};

struct LineBuffer {
    LineBuffer() = default;
    LineBuffer(const LineBuffer &) = delete;
    LineBuffer &operator=(const LineBuffer &) = delete;
    ~LineBuffer() { free(text); }

    char *text = nullptr;
    size_t size = 0;
};

} // namespace

WorkingList::~WorkingList() {
    for (const Entry *entry = begin(); entry && entry->line; ++entry)
        free(entry->line);
}

int WorkingList::build(std::span<const edit_item> items) {
    const size_t count = items.size() + 1;
    entries_.reset(static_cast<Entry *>(calloc(count, sizeof(Entry))));
    if (!entries_) {
        vlsys_log(LOG_ERR, "calloc(%d, %d): %m", static_cast<int>(count),
                  static_cast<int>(sizeof(Entry)));
        return -errno;
    }
    Entry *entry = entries_.get();
    for (const edit_item &item : items) {
        if (asprintf(&entry->line, "%s=%s\n", item.key, item.value) < 0) {
            entry->line = nullptr;
            vlsys_log(LOG_ERR, "asprintf(\"%s=%s\\n\"): %m", item.key, item.value);
            return -errno;
        }
        entry->match = strlen(item.key) + 1;
        entry->removing = item.remove == 1;
        ++entry;
    }
    return 0;
}

const WorkingList::Entry *WorkingList::take(std::string_view line) {
    for (Entry *entry = entries_.get(); entry->line; ++entry) {
        if (!entry->used && starts_with(line, std::string_view(entry->line, entry->match))) {
            entry->used = true;
            return entry;
        }
    }
    return nullptr;
}

// A missing file reads as an empty one.
static int open_old(const char *path, File *old) {
    old->reset(fopen(path, "re"));
    if (*old)
        return 0;
    if (errno != ENOENT) {
        vlsys_log(LOG_ERR, "%s: fopen(\"%s\", \"r\"): %m", "edit", path);
        return -errno;
    }
    old->reset(fopen("/dev/null", "re"));
    if (*old)
        return 0;
    vlsys_log(LOG_ERR, "%s: fopen(\"/dev/null\", \"r\"): %m", "edit");
    return -errno;
}

// 1 with the next line, its line feed included; 0 at the end of the file.
static int next_line(FILE *old, const char *path, LineBuffer *buffer, std::string_view *line) {
    const ssize_t length = getline(&buffer->text, &buffer->size, old);
    if (length >= 0) {
        *line = {buffer->text, static_cast<size_t>(length)};
        return 1;
    }
    // A directory reads as empty: nothing takes its place, the rename says so.
    if (feof(old) || errno == EISDIR)
        return 0;
    vlsys_log(LOG_ERR, "%s: getline(%s): %m", "edit", path);
    return -errno;
}

// The buffers stay the caller's: a failed commit shows the line last written, which stands in the
// one while the other takes the lines that are dropped.
static int write_new(FILE *old, const char *path, WorkingList *list, LineBuffer (&buffers)[2],
                     Replacement *replacement) {
    LineBuffer *buffer = &buffers[0];
    LineBuffer *last_written = &buffers[1];
    std::string_view line;
    bool in_line = false; // the line last written has no line feed
    int result = 0;
    while ((result = next_line(old, path, buffer, &line)) > 0) {
        if (line[0] == '\n' || line[0] == '#')
            continue;
        if (const WorkingList::Entry *const entry = list->take(line)) {
            if (entry->removing)
                continue;
            line = entry->line;
        }
        in_line = line.back() != '\n';
        if ((result = replacement->write(line)) != 0)
            return result;
        std::swap(buffer, last_written);
    }
    for (const auto *entry = list->begin(); result == 0 && entry->line; ++entry) {
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
    LineBuffer lines[2];
    File old;
    Replacement replacement;
    int result = make_directory_of(path);
    if (result == 0)
        result = list.build({items, count});
    if (result == 0)
        result = replacement.create(path, '-');
    if (result == 0)
        result = open_old(path, &old);
    if (result == 0)
        result = replacement.open();
    if (result == 0)
        result = write_new(old.get(), path, &list, lines, &replacement);
    if (result == 0)
        result = replacement.commit(Flush::to_disk);
    if (result == 0)
        result = replacement.set_mode();
    return result;
}

int edit_or_log(const char *path, std::span<const edit_item> items) {
    const int result = edit(path, items.data(), static_cast<uint32_t>(items.size()));
    if (result < 0)
        vlsys_log(LOG_ERR, "edit(%s): failed", path);
    return -result;
}

} // namespace vlsys
