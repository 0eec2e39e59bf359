#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"
#include "core/replacement.h"
#include "core/text.h"

#include <algorithm>
#include <cstring>
#include <fcntl.h>
#include <string_view>

namespace vlsys {

static int check_zone_file(const char *path) {
    const Fd file(open(path, O_RDONLY | O_CLOEXEC));
    if (!file) {
        vlsys_log(LOG_ERR, "open(%s): %m", path);
        return -errno;
    }
    static constexpr std::string_view magic = "TZif";
    char start[magic.size()];
    errno = EIO; // the reason when the file is shorter
    if (read(file.get(), start, sizeof start) != static_cast<ssize_t>(sizeof start)) {
        vlsys_log(LOG_ERR, "read(%s): %m", path);
        return -errno;
    }
    if (std::string_view(start, sizeof start) != magic) {
        vlsys_log(LOG_ERR, "%s: is not tzfile", path);
        return -ENOENT;
    }
    return 0;
}

// Makes a link beside the path and moves it there, so that the path always names something.
static int replace_link(const char *path, const char *target) {
    const Text link = format_text("%s.new", path);
    if (!link) {
        vlsys_log(LOG_ERR, "asprintf(\"%%s.new\", %s): %m", path);
        return -errno;
    }
    if (unlink(link.get()) != 0 && errno != ENOENT) {
        vlsys_log(LOG_ERR, "unlink(%s): %m", link.get());
        return -errno;
    }
    if (symlink(target, link.get()) != 0) {
        vlsys_log(LOG_ERR, "symlink(%s, %s): %m", target, link.get());
        return -errno;
    }
    if (rename(link.get(), path) != 0) {
        vlsys_log(LOG_ERR, "rename(%s, %s): %m", link.get(), path);
        return -errno;
    }
    return 0;
}

static int set_localtime(const char *zone) {
    char zone_file[VLSYS_PATH_SIZE];
    vlsys_strlcpy(zone_file, zoneinfo_prefix, sizeof zone_file);
    vlsys_strlcat(zone_file, zone, sizeof zone_file);
    const int result = check_zone_file(zone_file);
    if (result != 0)
        return result;
    const SystemPath localtime(localtime_path);
    return replace_link(localtime.text, zone_file);
}

// The clock file is read in pieces: a line, or the next 79 bytes of a longer one.
struct Piece {
    char bytes[79 + 1]; // room for a NUL
    size_t length;

    std::string_view text() const { return {bytes, length}; }
};

// False at the end of the file. Bytes are taken as they are, NUL included.
static bool read_piece(FILE *file, Piece *piece) {
    piece->length = 0;
    int c = 0;
    while (piece->length + 1 < sizeof piece->bytes && c != '\n' && (c = getc_unlocked(file)) != EOF)
        piece->bytes[piece->length++] = static_cast<char>(c);
    return piece->length > 0;
}

static Text make_zone_line(const char *zone) {
    Text line;
    if (zone[0] == '"') {
        line = format_text("ZONE=%s\n", zone);
        if (!line)
            vlsys_log(LOG_ERR, "asprintf(\"ZONE=%%s\\n\", %s): %m", zone);
    } else {
        line = format_text("ZONE=\"%s\"\n", zone);
        if (!line)
            vlsys_log(LOG_ERR, "asprintf(\"ZONE=\"%%s\"\\n\", %s): %m", zone);
    }
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
    while (read_piece(clock, &piece)) {
        std::string_view text = piece.text();
        if (text.find("ZONE=") != std::string_view::npos) {
            has_zone = true;
            text = cut_line;
        }
        in_line = text.back() != '\n';
        const int result = replacement->write(text);
        if (result != 0)
            return result;
    }
    if (ferror(clock)) {
        vlsys_log(LOG_ERR, "fgets(%s): %m", path);
        return -errno;
    }
    if (has_zone)
        return 0;
    const int result = in_line ? replacement->write("\n") : 0;
    return result != 0 ? result : replacement->write(zone_line);
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
    if (!clock) {
        vlsys_log(LOG_ERR, "fopen(\"%s\", \"r\"): %m", path.text);
        return -errno;
    }
    result = rewrite_clock(clock.get(), path.text, zone_line.get(), &replacement);
    if (result == 0)
        result = replacement.commit();
    if (result != 0)
        return result;
    replacement.set_mode(); // the zone is stored, whatever the mode
    return 0;
}

static size_t read_zone(FILE *clock, char *zone, size_t size) {
    static constexpr std::string_view key = "ZONE=\"";
    for (Piece piece; read_piece(clock, &piece);) {
        std::string_view value = piece.text();
        const size_t at = value.find(key);
        if (at == std::string_view::npos)
            continue;
        value.remove_prefix(at + key.size());
        char *const start = piece.bytes + at + key.size();
        start[std::min(value.rfind('"'), value.size())] = '\0';
        return vlsys_strlcpy(zone, start, size);
    }
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
        vlsys_log(LOG_ERR, "fopen(\"%s\", \"r\"): %m", path.text);
        return 0;
    }
    return read_zone(clock.get(), buffer, size);
}

size_t vlsys_get_utc_offset(char *buffer, size_t size) {
    if (!buffer || size == 0)
        return 0;
    const time_t now = time(nullptr);
    struct tm local;
    if (!localtime_r(&now, &local)) {
        vlsys_log(LOG_ERR, "%s: %m", "localtime_r");
        return 0;
    }
    return strftime(buffer, size, "%z", &local);
}
