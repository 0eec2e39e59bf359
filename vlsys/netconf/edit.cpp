#include "netconf/edit.h"

#include "core/log.h"
#include "core/replacement.h"
#include "core/text.h"

#include <algorithm>
#include <cstring>
#include <fcntl.h>
#include <string_view>

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

// The items with their lines, and which of them have met a line of the old file. A line's entry is
// looked up in a hash table of the keys: each entry is also the slot that has its number.
class WorkingList {
  public:
    struct Entry {
        std::string_view line; // "<key>=<value>\n"
        size_t match;          // how many bytes of it a line of the key begins with
        bool used;
        bool removing;
        Entry *next;  // unused one of the same slot, in list order
        Entry *first; // of this slot
    };

    int build(std::span<const edit_item> items);
    // Takes the first unused entry that the line belongs to; null when there is none.
    const Entry *take(std::string_view line);
    std::span<const Entry> entries() const { return {entries_.get(), count_}; }

  private:
    void add(size_t index, const edit_item &item, char *line);
    Entry **slot(uint32_t hash) { return &entries_[hash * uint64_t{count_} >> 32].first; }
    Entry **find(uint32_t hash, std::string_view start);

    size_t count_ = 0;
    size_t longest_ = 0; // match
    Owned<Entry[]> entries_;
    Text lines_;
};

// Reads a file line by line.
class LineReader {
  public:
    // A missing file reads as an empty one.
    int open(const char *path);
    // 1 with the next line, its line feed included, valid until the next call; 0 at the end.
    int next(std::string_view *line);

  private:
    int fill();

    const char *path_ = nullptr;
    Fd fd_;
    Text buffer_;
    size_t capacity_ = 0;
    size_t begin_ = 0; // of what is not yet taken
    size_t end_ = 0;
    bool at_end_ = false;
};

} // namespace

static constexpr uint32_t hash_start = 2166136261; // FNV-1a

static uint32_t hash_on(uint32_t hash, char c) {
    return (hash ^ static_cast<unsigned char>(c)) * 16777619;
}

static size_t line_length(const edit_item &item) {
    return strlen(item.key) + strlen(item.value) + strlen("=\n");
}

int WorkingList::build(std::span<const edit_item> items) {
    count_ = items.size();
    entries_.reset(static_cast<Entry *>(calloc(count_ + 1, sizeof(Entry))));
    if (!entries_) {
        vlsys_log(LOG_ERR, "calloc(%d, %d): %m", static_cast<int>(count_ + 1),
                  static_cast<int>(sizeof(Entry)));
        return -errno;
    }
    if (items.empty())
        return 0;
    size_t size = 0;
    for (const edit_item &item : items)
        size += line_length(item);
    lines_.reset(static_cast<char *>(malloc(size)));
    if (!lines_) {
        vlsys_log(LOG_ERR, "asprintf(\"%s=%s\\n\"): %m", items[0].key, items[0].value);
        return -errno;
    }
    // From the last one on, so that each goes before the later ones of its slot.
    for (size_t index = count_; index-- > 0;) {
        size -= line_length(items[index]);
        add(index, items[index], lines_.get() + size);
    }
    return 0;
}

void WorkingList::add(size_t index, const edit_item &item, char *line) {
    Entry &entry = entries_[index];
    char *end = stpcpy(line, item.key);
    *end++ = '=';
    entry.match = static_cast<size_t>(end - line);
    end = stpcpy(end, item.value);
    *end++ = '\n';
    entry.line = {line, static_cast<size_t>(end - line)};
    entry.removing = item.remove == 1;
    longest_ = std::max(longest_, entry.match);

    uint32_t hash = hash_start;
    for (size_t i = 0; i < entry.match; i++)
        hash = hash_on(hash, line[i]);
    Entry **const first = slot(hash);
    entry.next = *first;
    *first = &entry;
}

// The link to the first unused entry with this key and "="; null when there is none.
WorkingList::Entry **WorkingList::find(uint32_t hash, std::string_view start) {
    for (Entry **link = slot(hash); *link; link = &(*link)->next)
        if ((*link)->match == start.size() && starts_with((*link)->line, start))
            return link;
    return nullptr;
}

const WorkingList::Entry *WorkingList::take(std::string_view line) {
    const std::string_view start(line.data(), std::min(line.size(), longest_));
    Entry **link = nullptr;
    uint32_t hash = hash_start;
    size_t hashed = 0;
    // A key may have a "=" too.
    for (size_t at = 0; (at = start.find('=', at)) != std::string_view::npos; at++) {
        for (; hashed <= at; hashed++)
            hash = hash_on(hash, start[hashed]);
        Entry **const found = find(hash, {start.data(), hashed});
        if (found && (!link || *found < *link))
            link = found;
    }
    if (!link)
        return nullptr;
    Entry *const entry = *link;
    *link = entry->next;
    entry->used = true;
    return entry;
}

// As a rule the directory is there: it is made when the temporary can't be.
static int create(const char *path, Replacement *replacement) {
    if (replacement->create(path, '-', Failure::silent) == 0)
        return 0;
    const int result = make_directory_of(path);
    return result != 0 ? result : replacement->create(path, '-');
}

int LineReader::open(const char *path) {
    path_ = path;
    fd_.reset(::open(path, O_RDONLY | O_CLOEXEC));
    if (fd_)
        return 0;
    if (errno != ENOENT) {
        vlsys_log(LOG_ERR, "%s: fopen(\"%s\", \"r\"): %m", "edit", path);
        return -errno;
    }
    fd_.reset(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    if (fd_)
        return 0;
    vlsys_log(LOG_ERR, "%s: fopen(\"/dev/null\", \"r\"): %m", "edit");
    return -errno;
}

// Reads on behind what is not yet taken, in a larger buffer when that fills it.
int LineReader::fill() {
    if (begin_ > 0) {
        end_ -= begin_;
        memmove(buffer_.get(), buffer_.get() + begin_, end_);
        begin_ = 0;
    }
    if (end_ == capacity_) {
        capacity_ = std::max<size_t>(2 * capacity_, 8192);
        auto *const larger = static_cast<char *>(realloc(buffer_.get(), capacity_));
        if (!larger) {
            vlsys_log(LOG_ERR, "%s: getline(%s): %m", "edit", path_);
            return -errno;
        }
        static_cast<void>(buffer_.release());
        buffer_.reset(larger);
    }
    const ssize_t length =
        TEMP_FAILURE_RETRY(read(fd_.get(), buffer_.get() + end_, capacity_ - end_));
    // A directory reads as empty: nothing takes its place, the rename says so.
    if (length < 0 && errno != EISDIR) {
        vlsys_log(LOG_ERR, "%s: getline(%s): %m", "edit", path_);
        return -errno;
    }
    at_end_ = length <= 0;
    end_ += at_end_ ? 0 : static_cast<size_t>(length);
    return 0;
}

int LineReader::next(std::string_view *line) {
    size_t searched = 0;
    for (;;) {
        const std::string_view rest(buffer_.get() + begin_, end_ - begin_);
        const size_t feed = rest.find('\n', searched);
        if (feed != std::string_view::npos || (at_end_ && !rest.empty())) {
            *line = {rest.data(), std::min(feed, rest.size() - 1) + 1};
            begin_ += line->size();
            return 1;
        }
        if (at_end_)
            return 0;
        searched = rest.size();
        const int result = fill();
        if (result != 0)
            return result;
    }
}

static int write_new(LineReader *old, WorkingList *list, Replacement *replacement) {
    bool in_line = false; // the line last written has no line feed
    std::string_view line;
    int result = 0;
    while ((result = old->next(&line)) > 0) {
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
    }
    for (const auto &entry : list->entries()) {
        if (result != 0)
            return result;
        if (entry.used || entry.removing)
            continue;
        if (in_line)
            result = replacement->write("\n");
        in_line = false;
        if (result == 0)
            result = replacement->write(entry.line);
    }
    return result;
}

int edit(const char *path, const edit_item *items, uint32_t count) {
    if (!path || !items)
        return -EFAULT;
    WorkingList list;
    LineReader old;
    Replacement replacement;
    int result = list.build({items, count});
    if (result == 0)
        result = create(path, &replacement);
    if (result == 0)
        result = old.open(path);
    if (result == 0)
        result = write_new(&old, &list, &replacement);
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
