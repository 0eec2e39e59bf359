#include "device/product.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "device/avio.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace vlsys {

static void check_table(AvioBoard board) {
    if (avio_status.boards[board].device_id != 0)
        return;
    vlsys_log(LOG_WARNING, "%s", "avio_status is not initialized. rescan status");
    vlsys_avio_wait_ready();
}

int read_serial_number(FILE *stream, char *buffer, size_t size, int *status) {
    char line[8192];
    char status_text[8] = "";
    size_t length = 0;
    while (!ferror(stream) && read_line(stream, line, sizeof line) > 0) {
        vlsys_log(LOG_DEBUG, "%s", line);
        char *rest = nullptr;
        const char *const key = strtok_r(line, " \t:\n", &rest);
        if (key && strcmp(key, "MainSerialNumber") == 0) {
            const char *const value = strtok_r(nullptr, " \t:\n", &rest);
            length = vlsys_strlcpy(buffer, value ? value : "00000", size);
        }
        vlsys_strlcpy(status_text, line, sizeof status_text);
    }
    if (ferror(stream)) {
        vlsys_log(LOG_ERR, "fgets(%s): %m", serial_number_command);
        return -errno;
    }
    *status = static_cast<int>(strtol(status_text, nullptr, 10)); // seven characters always fit
    return static_cast<int>(length);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_destination(char *buffer, size_t size) {
    check_table(krd31);
    const int field = destination();
    if (field != destination_sy && field != destination_cn)
        vlsys_log(LOG_WARNING, "unknown destination: %d, fallback to \"SY\"", field);
    const size_t length = vlsys_strlcpy(buffer, field == destination_cn ? "CN" : "SY", size);
    vlsys_log(LOG_INFO, "Destination: %s", size > 0 ? buffer : "");
    return static_cast<int>(length);
}

int vlsys_get_fps(void) {
    char code[8];
    vlsys_get_destination(code, sizeof code);
    const int field = frame_frequency();
    int fps = field == frequency_50i ? 50 : 59;
    if (field != frequency_50i && field != frequency_59_94i) {
        fps = strcmp(code, "CN") == 0 ? 50 : 59;
        vlsys_log(LOG_WARNING, "unknown fps: %d, fallback to %d", field, fps);
    }
    vlsys_log(LOG_INFO, "FPS: %d", fps);
    return fps;
}

int vlsys_get_hdcp_capability(void) {
    check_table(tbx205);
    return can_handle_hdcp() ? 1 : 0;
}

int vlsys_get_serial_number(char *buffer, size_t size) {
    FILE *const stream = vlsys_popen(serial_number_command);
    if (!stream) {
        vlsys_log(LOG_ERR, "popen(\"%s\", \"re\"): %m", serial_number_command);
        return -errno;
    }
    int status = 0;
    const int length = read_serial_number(stream, buffer, size, &status);
    const int closed = vlsys_pclose(stream);

    if (length < 0)
        return length;
    const int exit_code = (status >> 8) & 0xff;
    if ((status & 0x7f) != 0)
        return -200 - status;
    if (exit_code != 0)
        return -200 - exit_code;
    if (closed != 0)
        return -301 - closed;
    return length;
}
