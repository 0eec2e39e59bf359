// The driver's status, the command tool's listing and the version file.
#include "device/avio.h"
#include "device/product.h"
#include "fuzz.h"
#include <vector>

static void check(Input &in) {
    files["status"] = in[0];
    vlsys::avio_status = {};
    const int mask = vlsys_avio_scan_alive();
    assert(mask < 0x400 && (mask >> 4 & ~mask & 15) == 0);
    for (int i = 0; i < 4; i++) {
        const auto [config, alive, id] = vlsys::avio_status.boards[i];
        assert(alive % 2 == (mask >> 4 >> i & 1) && id == alive % 2 * (0x4160 + i));
    }
    // A board's last register counts, an unknown board's never.
    files["status"] += "\nVendorID=3c2b DeviceID=4160\nAlive  : 0x25\nConfig : 1\nVendorID=3c2b "
                       "DeviceID=9999\nAlive  : 13\nConfig : 2\n";
    assert(vlsys_avio_scan_alive() == (mask | 0x111) && vlsys_get_fps() == 50);
    assert(vlsys_avio_read_config() == -1 && vlsys::avio_status.boards[0].config == 1);

    std::vector<char> text(in[3].size() + 1);
    int status = 0;
    for (const char *end : {"", "\nMainSerialNumber: 4711 12\n 256 1"}) {
        const vlsys::File file(fmemopen((in[1] += end).data(), in[1].size(), "r"));
        vlsys::read_serial_number(file.get(), text.data(), text.size(), &status);
        assert(abs(status) < 10000000 && has(in[1] + "00000", text.data()));
    }
    assert(status == 256 && text.data() == std::string("4711").substr(0, text.size() - 1));

    files["velmora-version"] = in[2];
    time_t time = 0;
    vlsys_get_version(text.data(), text.size(), &time);
    const std::string line = in[2].substr(0, std::min(in[2].find_first_of("\n", 0, 2), 1023UL));
    assert(text.data() == (in[2].empty() ? "1.00_SQA3" : line).substr(0, text.size() - 1));
}
