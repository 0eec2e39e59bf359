// The video I/O boards' registers, cached from the driver's status file.
#pragma once

#include <cstdint>
#include <cstdio>

namespace vlsys {

enum class AvioBoard { krd31, tbx204, tbx205, tbx206 };

struct AvioRegisters {
    uint32_t config;    // 0: normal boot, 1: boot from the backup image, others illegal
    uint8_t alive;      // bit 0 set; see the readers below
    uint16_t device_id; // 0 until an Alive register of the board was accepted
};

struct AvioStatus {
    AvioRegisters boards[4]; // by AvioBoard
    int config_read;         // 1 after a complete read of all Config registers without error
};

// Each read overwrites what it finds in the file; nothing empties the table again.
extern AvioStatus avio_status;

inline const AvioRegisters &registers_of(AvioBoard board) {
    return avio_status.boards[static_cast<int>(board)];
}

// Fields of the cached Alive registers; 0 and 3 are unknown.
enum class FrameFrequency { hz59_94 = 1, hz50 = 2 };
enum class Destination { sy = 1, cn = 2 };

inline FrameFrequency frame_frequency() {
    return static_cast<FrameFrequency>((registers_of(AvioBoard::krd31).alive >> 1) & 3);
}

inline Destination destination() {
    return static_cast<Destination>((registers_of(AvioBoard::krd31).alive >> 4) & 3);
}

inline bool can_handle_hdcp() {
    return (registers_of(AvioBoard::tbx205).alive & 0x40) != 0;
}

// The public readers' work on an open status file, with their results and messages.
int read_config(FILE *file);
int scan_alive(FILE *file);

} // namespace vlsys
