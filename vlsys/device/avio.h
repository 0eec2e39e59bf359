// The video I/O boards' registers, cached from the driver's status file.
#pragma once

#include <cstdint>
#include <cstdio>

namespace vlsys {

enum AvioBoard { krd31, tbx204, tbx205, tbx206 };

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

// Fields of the cached Alive registers; other values than the named ones are unknown.
enum FrameFrequency { frequency_59_94i = 1, frequency_50i = 2 };
enum Destination { destination_sy = 1, destination_cn = 2 };

inline int frame_frequency() {
    return (avio_status.boards[krd31].alive >> 1) & 3;
}

inline int destination() {
    return (avio_status.boards[krd31].alive >> 4) & 3;
}

inline bool can_handle_hdcp() {
    return (avio_status.boards[tbx205].alive & 0x40) != 0;
}

// The public readers' work on an open status file, with their results.
int read_config(FILE *file);
int scan_alive(FILE *file);

} // namespace vlsys
