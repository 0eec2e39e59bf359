#include "device/avio.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"
#include "core/text.h"

#include <string_view>

namespace vlsys {

AvioStatus avio_status;

namespace {

struct Board {
    const char *name;
    std::string_view device; // as the status file's header line names it
    uint16_t id;
    int found; // bits of the scan's result
    int alive;
    bool traces_alive;
};

} // namespace

// By AvioBoard.
static constexpr Board boards[] = {
    {"KRD-31", "DeviceID=4160", VLSYS_AVIO_KRD31, 0x01, 0x10, true},
    {"TBX-204", "DeviceID=4161", VLSYS_AVIO_TBX204, 0x02, 0x20, true},
    {"TBX-205", "DeviceID=4162", VLSYS_AVIO_TBX205, 0x04, 0x40, false},
    {"TBX-206", "DeviceID=4163", VLSYS_AVIO_TBX206, 0x08, 0x80, false},
};
static constexpr int board_count = static_cast<int>(std::size(boards));

// ---- Status file

static constexpr std::string_view header_prefix = "VendorID=3c2b ";
static constexpr std::string_view config_prefix = "Config :";
static constexpr std::string_view alive_prefix = "Alive  :";

static constexpr int no_board = -1;      // before the first header
static constexpr int unknown_board = -2; // under another board's header: its registers are not ours

namespace {

// A line that matters, and the board it belongs to.
struct StatusLine {
    int board = no_board; // index, no_board or unknown_board
    bool is_header = false;
    uint32_t value = 0; // of a register line
};

} // namespace

static int find_board(const char *device) {
    for (int i = 0; i < board_count; i++)
        if (starts_with(device, boards[i].device))
            return i;
    vlsys_log(LOG_ERR, "unknown device id: %s", device);
    return unknown_board;
}

// Signed, so that a minus sign cannot wrap around into the range of a register.
static uint32_t parse_register(const char *text) {
    const long long value = strtoll(text, nullptr, 16);
    return value < 0 || value > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(value);
}

// Reads on to the next header, or the next register line that begins with the prefix. Returns 1;
// 0 at the end of the file; the negated errno when it cannot be read, logged.
static int next_line(FILE *file, std::string_view register_prefix, StatusLine *status) {
    char line[1024];
    int result = 0;
    while ((result = read_line(file, line, sizeof line)) > 0) {
        const std::string_view text = line;
        status->is_header = starts_with(text, header_prefix);
        if (status->is_header) {
            status->board = find_board(line + header_prefix.size());
            return 1;
        }
        if (starts_with(text, register_prefix)) {
            status->value = parse_register(line + register_prefix.size());
            return 1;
        }
    }
    return result < 0 ? log_errno("fgets(%s)", avio_status_path) : 0;
}

int read_config(FILE *file) {
    avio_status.config_read = 0;
    int result = 0;
    int more = 0;
    StatusLine line;
    while ((more = next_line(file, config_prefix, &line)) > 0) {
        if (line.board < 0)
            result = -1;
        else if (!line.is_header)
            avio_status.boards[line.board].config = line.value;
    }
    if (more < 0)
        return -1;
    if (result == 0)
        avio_status.config_read = 1;
    return result;
}

static void accept_alive(int board, uint32_t value) {
    avio_status.boards[board].alive = static_cast<uint8_t>(value);
    avio_status.boards[board].device_id = boards[board].id;
    if (boards[board].traces_alive)
        vlsys_log(LOG_DEBUG, "%s Alive: %#x", boards[board].name, value);
}

int scan_alive(FILE *file) {
    int mask = 0;
    int more = 0;
    StatusLine line;
    while ((more = next_line(file, alive_prefix, &line)) > 0) {
        if (line.is_header) {
            mask |= line.board >= 0 ? boards[line.board].found : VLSYS_AVIO_UNKNOWN_DEVICE;
            continue;
        }
        const bool is_alive = (line.value & 1) != 0 && line.value < 0x100;
        if (!is_alive || line.board == unknown_board)
            continue;
        if (line.board == no_board) {
            mask |= VLSYS_AVIO_STRAY_ALIVE;
            continue;
        }
        accept_alive(line.board, line.value);
        mask |= boards[line.board].alive;
    }
    // What was found in a part of the file is not believed: a wait scans again.
    return more < 0 ? mask & ~VLSYS_AVIO_READY : mask;
}

static File open_status() {
    File file(fopen(avio_status_path, "re"));
    if (!file)
        log_errno("fopen(%s)", avio_status_path);
    return file;
}

// ---- Waiting for the boards

namespace {

struct Wait {
    bool is_ready; // all boards came up, or there is no driver to wait for
    int polls;     // that found the boards not ready
    int mask;      // of the last scan
};

// Names of boards, joined by ", ".
struct BoardList {
    char text[40] = "";
};

} // namespace

static Wait wait_alive() {
    constexpr int poll_limit = 960;
    constexpr struct timespec interval = {0, 29970030};
    for (int polls = 0;;) {
        const int mask = vlsys_avio_scan_alive();
        if (mask == VLSYS_AVIO_READY) {
            vlsys_log(LOG_INFO, "VlAvio alive");
            return {.is_ready = true, .polls = polls, .mask = mask};
        }
        if ((mask & VLSYS_AVIO_NO_DRIVER) != 0) {
            vlsys_log(LOG_WARNING, "%s", "can't get VlAvio status. Emulator ?");
            return {.is_ready = true, .polls = polls, .mask = mask};
        }
        polls++;
        if (polls == poll_limit || (nanosleep(&interval, nullptr) != 0 && errno == EINTR))
            return {.is_ready = false, .polls = polls, .mask = mask};
    }
}

// True when a board booted from its backup image.
static bool report_config() {
    bool from_backup = false;
    for (int i = 0; i < board_count; i++) {
        const char *const name = boards[i].name;
        const uint32_t config = avio_status.boards[i].config;
        vlsys_log(LOG_INFO, "%s: Config: %08x", name, config);
        if (config == 1) {
            vlsys_log(LOG_WARNING, "%s: bootup from backup", name);
            from_backup = true;
        } else if (config != 0) {
            vlsys_log(LOG_WARNING, "%s: illegal Config register: %08x", name, config);
        }
    }
    return from_backup;
}

static void report_alive() {
    static constexpr const char *frequencies[] = {"unknown", "59.94i", "50i", "unknown"};
    static constexpr const char *destinations[] = {"unknown", "SY", "CN", "unknown"};
    vlsys_log(LOG_INFO, "Frame Frequency: %s, Destination: %s",
              frequencies[static_cast<int>(frame_frequency())],
              destinations[static_cast<int>(destination())]);
    vlsys_log(LOG_INFO, "HDCP handling capability: %s", can_handle_hdcp() ? "yes" : "no");
}

static void append(BoardList *list, const Board &board) {
    if (list->text[0] != '\0')
        vlsys_strlcat(list->text, ", ", sizeof list->text);
    vlsys_strlcat(list->text, board.name, sizeof list->text);
}

static void report_timeout(const Wait &wait) {
    constexpr int polls_per_second = 30;
    vlsys_log(LOG_ERR, "timeout (%d). ", wait.polls / polls_per_second);
    BoardList not_found;
    BoardList not_alive;
    for (const Board &board : boards) {
        if ((wait.mask & board.found) == 0)
            append(&not_found, board);
        else if ((wait.mask & board.alive) == 0)
            append(&not_alive, board);
    }
    if (not_found.text[0] != '\0')
        vlsys_log(LOG_INFO, "not found device(s): %s", not_found.text);
    if (not_alive.text[0] != '\0')
        vlsys_log(LOG_INFO, "not alive device(s): %s", not_alive.text);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_avio_read_config(void) {
    const File file = open_status();
    return file ? read_config(file.get()) : -1;
}

int vlsys_avio_get_config(unsigned int device_id) {
    if (avio_status.config_read == 0 && vlsys_avio_read_config() != 0)
        return -1;
    for (int i = 0; i < board_count; i++)
        if (boards[i].id == device_id)
            return static_cast<int>(avio_status.boards[i].config);
    return -1;
}

int vlsys_avio_scan_alive(void) {
    const File file = open_status();
    return file ? scan_alive(file.get()) : VLSYS_AVIO_NO_DRIVER;
}

int vlsys_avio_wait_ready(void) {
    vlsys_log(LOG_INFO, "waiting for VlAvio to be ready");
    const Wait wait = wait_alive();
    const bool from_backup = vlsys_avio_read_config() == 0 && report_config();
    if (!wait.is_ready) {
        report_timeout(wait);
        return 0;
    }
    report_alive();
    return from_backup ? 0 : 1;
}
