#include "fixture.h"
#include "vlsys.h"

#include <csignal>

using namespace test;

using Device = Unit;

static const std::string krd31 = "VendorID=3c2b DeviceID=4160\n";
static const std::string tbx204 = "VendorID=3c2b DeviceID=4161\nConfig : 2\nAlive  : 1\n";
static const std::string tbx205 = "VendorID=3c2b DeviceID=4162\nConfig : 0\nAlive  : 41\n";
static const std::string tbx206 = "VendorID=3c2b DeviceID=4163\nConfig : 1\nAlive  : 1\n";

static const char status_file[] = "/proc/driver/VlAvio/status";

TEST_F(Device, ARegisterBelongsToTheBoardAbove) {
    const struct {
        std::string why, status;
        int alive, read, config;
    } rows[] = {
        {"all, in any order", tbx206 + tbx205 + tbx204 + krd31 + "Config :1f\n", 0xef, 0, 0x1f},
        {"too large", krd31 + "Config :100000000\nAlive  :113\n", 0x1, 0, -1},
        {"below zero", krd31 + "Config :-1\nAlive  :-ffffffffffffffff\n", 0x1, 0, -1},
        {"even, so not alive", krd31 + "Config :5\nAlive  : 12\n", 0x1, 0, 5},
        {"above no board", "Config :1\nAlive  :1\n" + krd31, 0x1 | VLSYS_AVIO_STRAY_ALIVE, -1, -1},
        {"an unknown board's", "VendorID=3c2b DeviceID=9\nConfig :1\nAlive  :1\n",
         VLSYS_AVIO_UNKNOWN_DEVICE, -1, -1},
    };
    for (const auto &row : rows) {
        write_file(status_file, row.status);
        EXPECT_EQ(vlsys_avio_scan_alive(), row.alive) << row.why;
        EXPECT_EQ(vlsys_avio_read_config(), row.read) << row.why;
        unlink(status_file); // what was read once is kept
        EXPECT_EQ(vlsys_avio_get_config(VLSYS_AVIO_KRD31), row.config) << row.why;
    }
    EXPECT_NE(take_log().find("3 unknown device id: DeviceID=9\n"), std::string::npos);
}

TEST_F(Device, TheRateAndTheDestinationComeFromTheBoards) {
    write_file(status_file, krd31 + "Alive  : 25\n" + tbx204 + tbx205 + tbx206);
    EXPECT_EQ(vlsys_get_fps(), 50);
    EXPECT_EQ(take_log(), "4 avio_status is not initialized. rescan status\n"
                          "6 waiting for VlAvio to be ready\n"
                          "7 KRD-31 Alive: 0x25\n"
                          "7 TBX-204 Alive: 0x1\n"
                          "6 VlAvio alive\n"
                          "6 KRD-31: Config: 00000000\n"
                          "6 TBX-204: Config: 00000002\n"
                          "4 TBX-204: illegal Config register: 00000002\n"
                          "6 TBX-205: Config: 00000000\n"
                          "6 TBX-206: Config: 00000001\n"
                          "4 TBX-206: bootup from backup\n"
                          "6 Frame Frequency: 50i, Destination: CN\n"
                          "6 HDCP handling capability: yes\n"
                          "6 Destination: CN\n"
                          "6 FPS: 50\n");
    EXPECT_EQ(vlsys_get_fps(), 50);
    EXPECT_EQ(take_log(), "6 Destination: CN\n6 FPS: 50\n") << "they are read once";
    EXPECT_EQ(vlsys_avio_wait_ready(), 0) << "one booted from its backup";
}

TEST_F(Device, TheWaitEndsAndTellsWhatIsMissing) {
    write_file(status_file, tbx205 + "VendorID=3c2b DeviceID=4161\n");
    interrupt_next_wait();
    EXPECT_EQ(vlsys_avio_wait_ready(), 0);
    EXPECT_EQ(take_waits().size(), 1U) << "a signal ends it";
    EXPECT_EQ(vlsys_avio_wait_ready(), 0);
    EXPECT_EQ(take_waits(), std::vector<int64_t>(959, 29970030)) << "a little under 29 seconds";
    EXPECT_EQ(vlsys_get_fps(), 59);
    const std::string log = take_log();
    EXPECT_EQ(log.substr(log.rfind("3 timeout")), "3 timeout (32). \n"
                                                  "6 not found device(s): KRD-31, TBX-206\n"
                                                  "6 not alive device(s): TBX-204\n"
                                                  "4 unknown destination: 0, fallback to \"SY\"\n"
                                                  "6 Destination: SY\n"
                                                  "4 unknown fps: 0, fallback to 59\n"
                                                  "6 FPS: 59\n");
}

TEST_F(Device, TheSerialNumberIsTakenFromTheListing) {
    const struct {
        std::string why, listing; // its last line is the wait status
        int result;
        const char *serial;
    } rows[] = {
        {"the last one counts", "MainSerialNumber:1 2\nMainSerialNumber\t22\n0", 2, "22"},
        {"no number", "MainSerialNumber :\n0\n", 5, "00000"},
        {"cut", "MainSerialNumber : 12345678901234567890\n0\n", 20, "123456789012345"},
        {"the tool failed", "MainSerialNumber : 5\n9\n256\n", VLSYS_SERIAL_COMMAND_FAILED - 1, "5"},
        {"no wait status", "MainSerialNumber : 5\n-9999\n", VLSYS_SERIAL_COMMAND_FAILED, "5"},
        {"a signal ended the tool", "MainSerialNumber : 5\n \t139 256\n",
         VLSYS_SERIAL_COMMAND_FAILED - 139, "5"},
    };
    char serial[16] = "";
    for (const auto &row : rows) {
        const auto request = answer("7\n", row.listing);
        EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), row.result) << row.why;
        EXPECT_STREQ(serial, row.serial) << row.why;
        const std::string line = row.listing.substr(0, row.listing.find('\n'));
        EXPECT_NE(take_log().find("7 " + line), std::string::npos) << row.why;
    }
}

TEST_F(Device, ASignalDoesNotCutTheListing) {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr); // without SA_RESTART
    write_file("/usr/bin/Tovrin", "sleep 0.2; exit 3");
    ualarm(50000, 50000);
    char serial[16] = "";
    EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), VLSYS_SERIAL_DIRECT_FAILED - 0x300);
}

TEST_F(Device, TheVersionFallsBackOnWhatIsMissing) {
    char version[16] = "";
    time_t time = 0;
    run("printf '2.5 b\\n2\\n' >/etc/velmora-version; touch -d @7 /etc/velmora-version");
    vlsys_get_version(version, sizeof version, &time);
    EXPECT_STREQ(version, "2.5 b");
    EXPECT_EQ(time, 7);
    unlink("/etc/velmora-version");
    vlsys_get_version(version, sizeof version, &time);
    EXPECT_STREQ(version, "1.00_SQA3");
    EXPECT_EQ(time, 1361778840);
}
