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

// The items with their lines, and which of them have met a line of the old file.
class WorkingList {
  public:
    struct Entry {
        std::string_view line; // "<key>=<value>\n"; empty in the entry that ends the list
        size_t match;          // how many bytes of it a line of the key begins with
        bool used;
        bool removing;
    };

    int build(std::span<const edit_item> items);
    // Takes the first unused entry that the line belongs to; null when there is none.
    const Entry *take(std::string_view line);
    const Entry *begin() const { return entries_.get(); }

  private:
    Owned<Entry[]> entries_;
    Text lines_;
    Entry *first_unused_ = nullptr; // a file that was set before has its keys in the items' order
};

// Reads a file line by line.
class LineReader {
  public:
    // Opens the file when it is there. The path must outlive the reader.
    explicit LineReader(const char *path) : path_(path), fd_(::open(path, O_RDONLY | O_CLOEXEC)) {}
    bool is_open() const { return static_cast<bool>(fd_); }
    // What is not open yet is tried again; a missing file reads as an empty one.
    int open();
    // 1 with the next line, its line feed included, valid until the next call; 0 at the end.
    int next(std::string_view *line);

  private:
    int fill();

    const char *path_;
    Fd fd_;
    Text buffer_;
    size_t capacity_ = 0;
    size_t begin_ = 0; // of what is not yet taken
    size_t end_ = 0;
    bool at_end_ = false;
};

} // namespace

static size_t line_length(const edit_item &item) {
    return strlen(item.key) + strlen(item.value) + strlen("=\n");
}

int WorkingList::build(std::span<const edit_item> items) {
    const size_t count = items.size() + 1;
    entries_.reset(static_cast<Entry *>(calloc(count, sizeof(Entry))));
    if (!entries_) {
        vlsys_log(LOG_ERR, "calloc(%d, %d): %m", static_cast<int>(count),
                  static_cast<int>(sizeof(Entry)));
        return -errno;
    }
    size_t size = 0;
    for (const edit_item &item : items)
        size += line_length(item);
    lines_.reset(static_cast<char *>(malloc(size)));
    if (!lines_ && size > 0) {
        vlsys_log(LOG_ERR, "asprintf(\"%s=%s\\n\"): %m", items[0].key, items[0].value);
        return -errno;
    }
    Entry *entry = first_unused_ = entries_.get();
    char *end = lines_.get();
    for (const edit_item &item : items) {
        const char *const line = end;
        end = stpcpy(end, item.key);
        *end++ = '=';
        entry->match = static_cast<size_t>(end - line);
        end = stpcpy(end, item.value);
        *end++ = '\n';
        entry->line = {line, static_cast<size_t>(end - line)};
        entry->removing = item.remove == 1;
        ++entry;
    }
    return 0;
}

const WorkingList::Entry *WorkingList::take(std::string_view line) {
    for (Entry *entry = first_unused_; !entry->line.empty(); ++entry) {
        // Most keys differ in their first letter: no call for these.
        if (entry->used || entry->line[0] != line[0] ||
            !starts_with(line, {entry->line.data(), entry->match}))
            continue;
        entry->used = true;
        while (first_unused_->used)
            ++first_unused_;
        return entry;
    }
    return nullptr;
}

int LineReader::open() {
    if (!fd_)
        fd_.reset(::open(path_, O_RDONLY | O_CLOEXEC));
    if (fd_)
        return 0;
    if (errno != ENOENT) {
        vlsys_log(LOG_ERR, "%s: fopen(\"%s\", \"r\"): %m", "edit", path_);
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
    for (const auto *entry = list->begin(); result == 0 && !entry->line.empty(); ++entry) {
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
    LineReader old(path);
    Replacement replacement;
    // The directory of a file that can be opened need not be made.
    int result = old.is_open() ? 0 : make_directory_of(path);
    if (result == 0)
        result = list.build({items, count});
    if (result == 0)
        result = replacement.create(path, '-');
    if (result == 0)
        result = old.open();
    if (result == 0)
        result = write_new(&old, &list, &replacement);
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
    return -result;
}

} // namespace vlsys
