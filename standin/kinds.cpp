#include "standin/kinds.h"

#include <cstring>
#include <iterator>

namespace unit {

static constexpr Board sy_at_59_94i = {.alive = 0x13};
static constexpr Board cn_at_50i = {.alive = 0x25};
static constexpr Board with_hdcp = {.alive = 0x41};

const Kind kinds[] = {
    {.name = "sy",
     .description = "four boards ready, destination SY, 59.94i, HDCP",
     .krd31 = sy_at_59_94i,
     .tbx205 = with_hdcp},
    {.name = "cn",
     .description = "four boards ready, destination CN, 50i, no HDCP",
     .krd31 = cn_at_50i},
    {.name = "no-driver", .description = "the video I/O driver is not loaded", .driver = false},
    {.name = "no-surrogate",
     .description = "the surrogate parent does not run",
     .surrogate = false,
     .krd31 = sy_at_59_94i,
     .tbx205 = with_hdcp},
    {.name = "board-missing",
     .description = "TBX-206 is missing: a wait of 29 seconds",
     .krd31 = sy_at_59_94i,
     .tbx205 = with_hdcp,
     .tbx206 = {.alive = Board::missing}},
    {.name = "board-not-alive",
     .description = "TBX-204 does not come up: a wait of 29 seconds",
     .krd31 = sy_at_59_94i,
     .tbx204 = {.alive = 0},
     .tbx205 = with_hdcp},
    {.name = "backup-boot",
     .description = "TBX-205 booted from its backup image",
     .krd31 = sy_at_59_94i,
     .tbx205 = {.config = 1, .alive = 0x41}},
    {.name = "serial-fails",
     .description = "the serial number cannot be read",
     .serial = false,
     .krd31 = sy_at_59_94i,
     .tbx205 = with_hdcp},
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
    unsigned device = 0x4160;
    for (const Board &board : {kind.krd31, kind.tbx204, kind.tbx205, kind.tbx206}) {
        char lines[128];
        snprintf(lines, sizeof lines,
                 "\nVendorID=3c2b DeviceID=%x\nConfig : %08x\nAlive  : %08x\nErrors : 00000000\n",
                 device++, static_cast<unsigned>(board.config), static_cast<unsigned>(board.alive));
        if (board.alive != Board::missing)
            text += lines;
    }
    return text;
}

} // namespace unit
