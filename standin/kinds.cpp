#include "standin/kinds.h"

#include <cstring>
#include <iterator>

namespace unit {

// Alive registers: 0x13 is SY at 59.94i, 0x25 is CN at 50i; 0x41 is HDCP.
const Kind kinds[] = {
    {"sy",
     "four boards ready, destination SY, 59.94i, HDCP",
     true,
     true,
     true,
     {{0, 0x13}, {0, 0x01}, {0, 0x41}, {0, 0x01}}},
    {"cn",
     "four boards ready, destination CN, 50i, no HDCP",
     true,
     true,
     true,
     {{0, 0x25}, {0, 0x01}, {0, 0x01}, {0, 0x01}}},
    {"no-driver", "the video I/O driver is not loaded", true, true, false, {}},
    {"no-surrogate",
     "the surrogate parent does not run",
     false,
     true,
     true,
     {{0, 0x13}, {0, 0x01}, {0, 0x41}, {0, 0x01}}},
    {"board-missing",
     "TBX-206 is missing: a wait of 29 seconds",
     true,
     true,
     true,
     {{0, 0x13}, {0, 0x01}, {0, 0x41}, {0, -1}}},
    {"board-not-alive",
     "TBX-204 does not come up: a wait of 29 seconds",
     true,
     true,
     true,
     {{0, 0x13}, {0, 0}, {0, 0x41}, {0, 0x01}}},
    {"backup-boot",
     "TBX-205 booted from its backup image",
     true,
     true,
     true,
     {{0, 0x13}, {0, 0x01}, {1, 0x41}, {0, 0x01}}},
    {"serial-fails",
     "the serial number cannot be read",
     true,
     false,
     true,
     {{0, 0x13}, {0, 0x01}, {0, 0x41}, {0, 0x01}}},
};
const Kind *const kinds_end = std::end(kinds);

const Kind *find_kind(const char *name) {
    for (const Kind &kind : kinds)
        if (strcmp(kind.name, name) == 0)
            return &kind;
    return nullptr;
}

std::string driver_status(const Kind &kind) {
    std::string text = "VlAvio\n";
    for (int i = 0; i < 4; i++) {
        if (kind.boards[i].alive < 0)
            continue;
        char board[128];
        snprintf(board, sizeof board,
                 "\nVendorID=3c2b DeviceID=%x\nConfig : %08x\nAlive  : %08x\nErrors : 00000000\n",
                 0x4160U + static_cast<unsigned>(i), static_cast<unsigned>(kind.boards[i].config),
                 static_cast<unsigned>(kind.boards[i].alive));
        text += board;
    }
    return text;
}

} // namespace unit
