#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"
#include "core/replacement.h"
#include "core/text.h"

#include <algorithm>
#include <cstring>
#include <fcntl.h>
#include <string_view>
#include <sys/stat.h>
#include <unistd.h>

namespace vlsys {

static int check_zone_file(const char *path) {
    const Fd file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK)); // a pipe must not hold the caller
    if (!file)
        return log_errno("open(%s)", path);
    static constexpr std::string_view magic = "TZif";
    char start[magic.size()];
    const ssize_t length = TEMP_FAILURE_RETRY(read(file.get(), start, sizeof start));
    if (length >= 0 && length < static_cast<ssize_t>(sizeof start))
        errno = EIO; // the system has none for a file that is shorter
    if (length != static_cast<ssize_t>(sizeof start))
        return log_errno("read(%s)", path);
    if (std::string_view(start, sizeof start) != magic) {
        vlsys_log(LOG_ERR, "%s: is not tzfile", path);
        return -ENOENT;
    }
    return 0;
}

// Whether a shell that sources the clock file would take the zone, in its double quotes, for more
// than a text. A zone may have brought the quotes along.
static bool has_shell_text(const char *zone) {
    if (*zone == '"')
        zone++;
    zone += strcspn(zone, "\"$`\\\n");
    return *zone != '\0' && strcmp(zone, "\"") != 0;
}

// By name too: /etc/localtime may be a hard link to the zone file.
static bool is_same_entry(const char *a, const char *b) {
    struct stat status_a;
    struct stat status_b;
    return strcmp(basename(a), basename(b)) == 0 && lstat(a, &status_a) == 0 &&
           lstat(b, &status_b) == 0 && status_a.st_dev == status_b.st_dev &&
           status_a.st_ino == status_b.st_ino;
}

// Whether the zone is the system's link itself, or a link to it, as "localtime" is on some systems.
static bool leads_back(const char *zone_file, const char *link) {
    char target[VLSYS_PATH_SIZE];
    const ssize_t length = readlink(zone_file, target, sizeof target - 1);
    target[std::max<ssize_t>(length, 0)] = '\0';
    return is_same_entry(zone_file, link) || is_same_entry(target, link);
}

// Makes a link beside the path and moves it there, so that the path always names something.
static int replace_link(const char *path, const char *target) {
    const Text link = format_text("%s.new", path);
    if (!link)
        return log_errno("asprintf(\"%%s.new\", %s)", path);
    if (unlink(link.get()) != 0 && errno != ENOENT)
        return log_errno("unlink(%s)", link.get());
    if (symlink(target, link.get()) != 0)
        return log_errno("symlink(%s, %s)", target, link.get());
    if (rename(link.get(), path) != 0)
        return log_errno("rename(%s, %s)", link.get(), path);
    return 0;
}

static int set_localtime(const char *zone) {
    char zone_file[VLSYS_PATH_SIZE];
    vlsys_strlcpy(zone_file, zoneinfo_prefix, sizeof zone_file);
    if (vlsys_strlcat(zone_file, zone, sizeof zone_file) >= sizeof zone_file) {
        errno = ENAMETOOLONG; // the beginning may be the path of another zone
        return log_errno("open(%s)", zone_file);
    }
    if (has_shell_text(zone)) {
        errno = EINVAL; // such a file may exist: a zone with ".." leads out of the directory
        return log_errno("open(%s)", zone_file);
    }
    const int result = check_zone_file(zone_file);
    if (result != 0)
        return result;
    const SystemPath path(localtime_path);
    if (leads_back(zone_file, path.text)) {
        errno = ELOOP;
        return log_errno("open(%s)", zone_file);
    }
    return replace_link(path.text, zone_file);
}

namespace {

// The clock file is read in pieces: a line, or the next 79 bytes of a longer one.
struct Piece {
    char bytes[79 + 1]; // room for a NUL
    size_t length;

    std::string_view text() const { return {bytes, length}; }
};

} // namespace

// Bytes are taken as they are, NUL included. Returns 1; 0 at the end of the file; the negated errno
// when it cannot be read (not logged).
static int read_piece(FILE *file, Piece *piece) {
    piece->length = 0;
    int c = 0;
    while (piece->length + 1 < sizeof piece->bytes && c != '\n' && (c = next_byte(file)) != EOF)
        piece->bytes[piece->length++] = static_cast<char>(c);
    if (c == EOF && ferror(file))
        return -errno;
    return piece->length > 0 ? 1 : 0;
}

// Null, after the message, when there is no memory.
static Text make_zone_line(const char *zone) {
    const bool is_quoted = zone[0] == '"';
    Text line = is_quoted ? format_text("ZONE=%s\n", zone) : format_text("ZONE=\"%s\"\n", zone);
    if (!line && is_quoted)
        log_errno("asprintf(\"ZONE=%%s\\n\", %s)", zone);
    else if (!line)
        log_errno("asprintf(\"ZONE=\"%%s\"\\n\", %s)", zone);
    return line;
}

// Copies the clock file with the zone line in place of every piece that has a zone, or at the end.
static int rewrite_clock(FILE *clock, const char *path, std::string_view zone_line,
                         Replacement *replacement) {
    Piece piece;
    const std::string_view cut_line(zone_line.data(),
                                    std::min(zone_line.size(), sizeof piece.bytes - 1));
    bool has_zone = false;
    bool in_line = false;
    int result = 0;
    while ((result = read_piece(clock, &piece)) > 0) {
        std::string_view text = piece.text();
        if (text.find("ZONE=") != std::string_view::npos) {
            has_zone = true;
            text = cut_line;
        }
        in_line = text.back() != '\n';
        result = replacement->write(text);
        if (result < 0)
            return result;
    }
    if (result < 0)
        return log_errno("fgets(%s)", path);
    if (has_zone)
        return 0;
    result = in_line ? replacement->write("\n") : 0;
    return result < 0 ? result : replacement->write(zone_line);
}

static int set_clock_zone(const char *zone) {
    const SystemPath path(clock_path);
    const Text zone_line = make_zone_line(zone);
    if (!zone_line)
        return -errno;
    Replacement replacement;
    int result = replacement.create(path.text, '.');
    if (result != 0)
        return result;
    const File clock(fopen(path.text, "re"));
    if (!clock)
        return log_errno("fopen(\"%s\", \"r\")", path.text);
    result = rewrite_clock(clock.get(), path.text, zone_line.get(), &replacement);
    if (result == 0)
        result = replacement.commit();
    if (result != 0)
        return result;
    replacement.set_mode(); // the zone is stored, whatever the mode
    return 0;
}

// The length of the zone, which is copied; 0 without one, and when the file cannot be read.
static size_t read_zone(FILE *clock, const char *path, char *zone, size_t size) {
    static constexpr std::string_view key = "ZONE=\"";
    Piece piece;
    int result = 0;
    while ((result = read_piece(clock, &piece)) > 0) {
        std::string_view value = piece.text();
        const size_t at = value.find(key);
        if (at == std::string_view::npos)
            continue;
        value.remove_prefix(at + key.size());
        char *const start = piece.bytes + at + key.size();
        start[std::min(value.rfind('"'), value.size())] = '\0';
        return vlsys_strlcpy(zone, start, size);
    }
    if (result < 0)
        log_errno("fgets(%s)", path);
    return 0;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_timezone(const char *zone) {
    if (!zone)
        return -EFAULT;
    if (zone[0] == '\0')
        return -ENOENT;
    int result = set_localtime(zone);
    if (result == 0)
        result = set_clock_zone(zone);
    if (result != 0)
        return result;
    if (setenv("TZ", zone, 1) == 0)
        tzset();
    return 0;
}

size_t vlsys_get_timezone(char *buffer, size_t size) {
    if (!buffer)
        return 0;
    const SystemPath path(clock_path);
    const File clock(fopen(path.text, "re"));
    if (!clock) {
        log_errno("fopen(\"%s\", \"r\")", path.text);
        return 0;
    }
    return read_zone(clock.get(), path.text, buffer, size);
}

size_t vlsys_get_utc_offset(char *buffer, size_t size) {
    if (!buffer || size == 0)
        return 0;
    const time_t now = time(nullptr);
    struct tm local;
    if (!localtime_r(&now, &local)) {
        log_errno("%s", "localtime_r");
        return 0;
    }
    return strftime(buffer, size, "%z", &local);
}
