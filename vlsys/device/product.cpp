#include "device/product.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "device/avio.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace vlsys {

// Waits, for 29 seconds at most, unless the board's Alive register is in the table.
static void wait_for_board(AvioBoard board) {
    if (registers_of(board).device_id != 0)
        return;
    vlsys_log(LOG_WARNING, "%s", "avio_status is not initialized. rescan status");
    vlsys_avio_wait_ready();
}

int read_serial_number(FILE *stream, char *buffer, size_t size, int *status) {
    char line[8192];
    char status_text[8] = "";
    size_t length = 0;
    int result = 0;
    while ((result = read_line(stream, line, sizeof line)) > 0) {
        vlsys_log(LOG_DEBUG, "%s", line);
        char *rest = nullptr;
        const char *const key = strtok_r(line, " \t:\n", &rest);
        if (key && strcmp(key, "MainSerialNumber") == 0) {
            const char *const value = strtok_r(nullptr, " \t:\n", &rest);
            length = vlsys_strlcpy(buffer, value ? value : "00000", size);
        }
        vlsys_strlcpy(status_text, line, sizeof status_text);
    }
    if (result < 0)
        return log_errno("fgets(%s)", serial_number_command);
    *status = static_cast<int>(strtol(status_text, nullptr, 10)); // seven characters always fit
    return static_cast<int>(length);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_destination(char *buffer, size_t size) {
    wait_for_board(AvioBoard::krd31);
    const Destination code = destination();
    if (code != Destination::sy && code != Destination::cn)
        vlsys_log(LOG_WARNING, "unknown destination: %d, fallback to \"SY\"",
                  static_cast<int>(code));
    const size_t length = vlsys_strlcpy(buffer, code == Destination::cn ? "CN" : "SY", size);
    vlsys_log(LOG_INFO, "Destination: %s", size > 0 ? buffer : "");
    return static_cast<int>(length);
}

int vlsys_get_fps(void) {
    char code[8];
    vlsys_get_destination(code, sizeof code);
    const FrameFrequency frequency = frame_frequency();
    int fps = frequency == FrameFrequency::hz50 ? 50 : 59;
    if (frequency != FrameFrequency::hz50 && frequency != FrameFrequency::hz59_94) {
        fps = strcmp(code, "CN") == 0 ? 50 : 59;
        vlsys_log(LOG_WARNING, "unknown fps: %d, fallback to %d", static_cast<int>(frequency), fps);
    }
    vlsys_log(LOG_INFO, "FPS: %d", fps);
    return fps;
}

int vlsys_get_hdcp_capability(void) {
    wait_for_board(AvioBoard::tbx205);
    return can_handle_hdcp() ? 1 : 0;
}

int vlsys_get_serial_number(char *buffer, size_t size) {
    FILE *const stream = vlsys_popen(serial_number_command);
    if (!stream)
        return log_errno("popen(\"%s\", \"re\")", serial_number_command);
    int status = 0;
    const int length = read_serial_number(stream, buffer, size, &status);
    const int closed = vlsys_pclose(stream);

    if (length < 0)
        return length;
    if (status < 0)
        return VLSYS_SERIAL_COMMAND_FAILED; // subtracted, it could pass for a length
    const int exit_code = (status >> 8) & 0xff;
    if ((status & 0x7f) != 0)
        return VLSYS_SERIAL_COMMAND_FAILED - status;
    if (exit_code != 0)
        return VLSYS_SERIAL_COMMAND_FAILED - exit_code;
    if (closed != 0)
        return VLSYS_SERIAL_DIRECT_FAILED - closed;
    return length;
}
