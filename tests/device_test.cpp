#include "device/avio.h"
#include "fixture.h"
#include "vlsys.h"

using namespace test;
using std::string;

static const string other = "VendorID=3c2b DeviceID=4164\n";
static const string krd31 = "VendorID=3c2b DeviceID=4160\n";
static const string tbx204 = "VendorID=3c2b DeviceID=4161\nConfig : 2\nAlive  : 1\n";
static const string tbx205 = "VendorID=3c2b DeviceID=4162\nConfig : 0\nAlive  : 41\n";
static const string tbx206 = "VendorID=3c2b DeviceID=4163\nConfig : 1\nAlive  : 1\n";

class Device : public Unit {};

static void set_status(const string &text) {
    write_file("/proc/driver/VlAvio/status", text);
    vlsys::avio_status = {{}, 1}; // as after a read that found no board
    take_log();
}

TEST_F(Device, RegistersBelongToTheBoardAbove) {
    const std::pair<string, const char *> cases[] = {
        {krd31 + "Config : 0x1f\nAlive  :\t13\nAlive  :25\nAlive  :12\n", "11 0: 1f 25 4160"},
        {krd31 + "Config :100000000\nAlive  :113\n Alive  :1\n", "1 0: ffffffff 0 0"},
        {krd31 + "Config :" + string(40, 'f') + "\nAlive  :\n", "1 0: ffffffff 0 0"},
        {"Alive  :2\n" + krd31 + "Config :-1\nAlive  :-ffffffffffffffff\n", "1 0: ffffffff 0 0"},
        {krd31 + string("Config :\0001\n", 11) + string(1023, ' ') + "Alive  :1\n", "1 0: 0 0 0"},
        {"Alive  :1\nConfig :1\n" + krd31, "201 -1: 0 0 0"},
        {krd31 + other + "Alive  :1\nConfig :1\n", "101 -1: 0 0 0"},
        {other + "Alive  :1\n" + krd31 + "Alive  :3\nConfig :1\n", "111 -1: 1 3 4160"},
        {tbx206 + tbx205 + tbx204 + krd31 + "Alive  :3\n", "ff 0: 0 3 4160"},
    };
    for (const auto &[status, expected] : cases) {
        set_status(status);
        const int mask = vlsys_avio_scan_alive();
        const int result = vlsys_avio_read_config();
        const auto &[config, alive, id] = vlsys::avio_status.boards[0];
        char text[64];
        snprintf(text, sizeof text, "%x %d: %x %x %x", mask, result, config, alive, id);
        EXPECT_STREQ(text, expected) << status;
        EXPECT_EQ(vlsys_avio_get_config(0x4160), result == 0 ? static_cast<int>(config) : -1);
    }
    EXPECT_EQ(vlsys_avio_get_config(0x4161), 2);
    EXPECT_EQ(vlsys_avio_get_config(0x4164), -1);
}

TEST_F(Device, WaitReportsWhatCameUp) {
    const std::tuple<string, size_t, int, string> cases[] = {
        {tbx205 + krd31 + "Config :0\nAlive  :25\n" + tbx204 + tbx206 + "Config :0\n", 0, 1,
         "7 KRD-31 Alive: 0x25\n7 TBX-204 Alive: 0x1\n6 VlAvio alive\n"
         "6 KRD-31: Config: 00000000\n6 TBX-204: Config: 00000002\n"
         "4 TBX-204: illegal Config register: 00000002\n6 TBX-205: Config: 00000000\n"
         "6 TBX-206: Config: 00000000\n6 Frame Frequency: 50i, Destination: CN\n"
         "6 HDCP handling capability: yes\n"},
        {tbx206 + krd31 + "Alive  :13\n" + tbx204 + tbx205 + "Alive  :1\n", 0, 0,
         "6 TBX-206: Config: 00000001\n4 TBX-206: bootup from backup\n"
         "6 Frame Frequency: 59.94i, Destination: SY\n6 HDCP handling capability: no\n"},
        {tbx205 + "VendorID=3c2b DeviceID=4161\n", 959, 0,
         "3 timeout (32). \n6 not found device(s): KRD-31, TBX-206\n"
         "6 not alive device(s): TBX-204\n"},
        {krd31 + "Alive  :1\n" + tbx204 + tbx205 + tbx206 + other, 60, 0,
         "3 unknown device id: DeviceID=4164\n\n3 timeout (2). \n"},
    };
    for (const auto &[status, sleeps, result, log_end] : cases) {
        set_status(status);
        fail_call("nanosleep", 60, sleeps == 60 ? EINTR : EINVAL);
        EXPECT_EQ(vlsys_avio_wait_ready(), result);
        EXPECT_EQ(take_waits(), std::vector<int64_t>(sleeps, 29970030));
        EXPECT_TRUE(take_log().ends_with(log_end)) << log_end;
    }
}

TEST_F(Device, DestinationAndRateComeFromTheAliveRegister) {
    const std::pair<uint8_t, string> cases[] = {
        {0x13, "6 Destination: SY\n6 FPS: 59\n"},
        {0x25, "6 Destination: CN\n6 FPS: 50\n"},
        {0x23, "6 Destination: CN\n6 FPS: 59\n"},
        {0x11, "6 Destination: SY\n4 unknown fps: 0, fallback to 59\n6 FPS: 59\n"},
        {0x27, "6 Destination: CN\n4 unknown fps: 3, fallback to 50\n6 FPS: 50\n"},
        {0xcd, "4 unknown destination: 0, fallback to \"SY\"\n6 Destination: SY\n6 FPS: 50\n"},
    };
    for (const auto &[alive, expected] : cases) {
        vlsys::avio_status = {{{0, alive, 0x4160}}, 0};
        EXPECT_EQ(vlsys_get_fps(), std::stoi(expected.substr(expected.size() - 3)));
        EXPECT_EQ(take_log(), expected);
    }
    unlink("/proc/driver/VlAvio/status");
    EXPECT_EQ(vlsys_get_hdcp_capability(), 0); // no TBX-205 yet
    const string absent = "3 fopen(/proc/driver/VlAvio/status): No such file or directory\n";
    EXPECT_EQ(
        take_log(),
        "4 avio_status is not initialized. rescan status\n6 waiting for VlAvio to be ready\n" +
            absent + "4 can't get VlAvio status. Emulator ?\n" + absent +
            "6 Frame Frequency: 50i, Destination: unknown\n6 HDCP handling capability: no\n");
}

TEST_F(Device, SerialNumberIsTakenFromTheListing) {
    const std::pair<string, const char *> cases[] = {
        {"Board : KRD-31\nMainSerialNumber : 41600123\n0\n", "8 41600123"},
        {"MainSerialNumber:1 2\nMainSerialNumber\t22\n0", "2 22"},
        {"MainSerialNumber :\n0\n", "5 00000"},
        {"Board MainSerialNumber : 1\nMainSerialNumbers : 1\n0\n", "0 unchanged"},
        {"MainSerialNumber : 12345678901234567890\n0\n", "20 123456789012345"},
        {string(8191, 'x') + "MainSerialNumber : 1\n0\n", "0 unchanged"},
        {"MainSerialNumber : 5\n9\n256\n", "-201 5"},
        {"MainSerialNumber : 5\n \t139 256\n", "-339 5"},
    };
    for (const auto &[output, expected] : cases) {
        const ScriptedSurrogate surrogate("7\n", ScriptedSurrogate::Then::await_start, output);
        char serial[16] = "unchanged";
        const int result = vlsys_get_serial_number(serial, sizeof serial);
        EXPECT_EQ(std::to_string(result) + " " + serial, expected) << output;
    }
    write_file("/usr/bin/Tovrin", "echo MainSerialNumber : 5\nexit 3\n");
    EXPECT_EQ(vlsys_get_serial_number(nullptr, 0), -301 - 0x300); // without the surrogate parent
}

TEST_F(Device, VersionFallsBackOnWhatIsMissing) {
    const std::pair<string, string> cases[] = {
        {"printf '2.5 b\\n2\\n' >$f; touch -d @7 $f", "2.5 b 7 "},
        {"echo >$f; touch -d @0 $f", " 1361778840 "},
        {"rm $f",
         "1.00_SQA3 1361778840 3 fopen(/etc/velmora-version): No such file or directory\n"},
    };
    for (const auto &[command, expected] : cases) {
        run("f=/etc/velmora-version; " + command);
        char version[16];
        time_t time = 0;
        vlsys_get_version(version, sizeof version, &time);
        EXPECT_EQ(version + (" " + std::to_string(time)) + " " + take_log(), expected);
    }
}
