// The video boards' registers, and what the unit says of itself.
#include "fixture.h"
#include "vlsys.h"

#include <csignal>

using namespace test;
using std::string;
using Then = ScriptedSurrogate::Then;

using Device = Unit;

static const string krd31 = "VendorID=3c2b DeviceID=4160\n";
static const string tbx204 = "VendorID=3c2b DeviceID=4161\nConfig : 2\nAlive  : 1\n";
static const string tbx205 = "VendorID=3c2b DeviceID=4162\nConfig : 0\nAlive  : 41\n";
static const string tbx206 = "VendorID=3c2b DeviceID=4163\nConfig : 1\nAlive  : 1\n";
static const string other = "VendorID=3c2b DeviceID=4164\n";

static void set_status(const string &text) {
    write_file("/proc/driver/VlAvio/status", text);
}

TEST_F(Device, ARegisterBelongsToTheBoardAbove) {
    const struct {
        string why, status;
        int mask, result, config;
    } rows[] = {
        {"both", krd31 + "Config : 0x1f\nAlive  :\t13\n", 0x11, 0, 0x1f},
        {"the last odd one counts", krd31 + "Alive  :13\nAlive  :12\n", 0x11, 0, 0},
        {"even", krd31 + "Alive  : 12\n", 0x1, 0, 0},
        {"too large", krd31 + "Config :100000000\nAlive  :113\n", 0x1, 0, -1},
        {"below zero", krd31 + "Config :-1\nAlive  :-ffffffffffffffff\n", 0x1, 0, -1},
        {"no number", krd31 + "Config :\nAlive  :\n", 0x1, 0, 0},
        {"within a line", krd31 + " Config :1\n" + string(1023, ' ') + "Alive  :1\n", 0x1, 0, 0},
        {"above no board", "Config :1\nAlive  :1\n" + krd31, 0x201, -1, -1},
        {"an unknown board's", krd31 + other + "Config :1\nAlive  :1\n", 0x101, -1, -1},
        {"all, in any order", tbx206 + tbx205 + tbx204 + krd31 + "Alive  :3\n", 0xff, 0, 0},
    };
    for (const auto &row : rows) {
        set_status(krd31 + "Config :0\n");
        vlsys_avio_read_config();
        set_status(row.status);
        EXPECT_EQ(vlsys_avio_scan_alive(), row.mask) << row.why;
        EXPECT_EQ(vlsys_avio_read_config(), row.result) << row.why;
        EXPECT_EQ(vlsys_avio_get_config(0x4160), row.config) << row.why;
    }
    EXPECT_TRUE(logged(LOG_ERR, "unknown device id: DeviceID=4164\n"));
    EXPECT_EQ(vlsys_avio_get_config(0x4161), 2);
    EXPECT_EQ(vlsys_avio_get_config(0x4164), -1) << "no such board";
}

TEST_F(Device, TheWaitReportsWhatCameUp) {
    const struct {
        string why, status;
        size_t sleeps;
        int result;
        string log_end;
    } rows[] = {
        {"all are up",
         krd31 + "Config : 0\nAlive  : 25\n" + tbx204 + tbx205 + tbx206 + "Config : 0\n", 0, 1,
         "7 KRD-31 Alive: 0x25\n7 TBX-204 Alive: 0x1\n6 VlAvio alive\n6 KRD-31: Config: 00000000\n"
         "6 TBX-204: Config: 00000002\n4 TBX-204: illegal Config register: 00000002\n"
         "6 TBX-205: Config: 00000000\n6 TBX-206: Config: 00000000\n"
         "6 Frame Frequency: 50i, Destination: CN\n6 HDCP handling capability: yes\n"},
        {"a backup boot", krd31 + "Alive  : 13\n" + tbx204 + tbx205 + "Alive  : 1\n" + tbx206, 0, 0,
         "6 TBX-206: Config: 00000001\n4 TBX-206: bootup from backup\n"
         "6 Frame Frequency: 59.94i, Destination: SY\n6 HDCP handling capability: no\n"},
        {"some missing", tbx205 + "VendorID=3c2b DeviceID=4161\n", 959, 0,
         "3 timeout (32). \n6 not found device(s): KRD-31, TBX-206\n"
         "6 not alive device(s): TBX-204\n"},
    };
    for (const auto &row : rows) {
        set_status(row.status);
        EXPECT_EQ(vlsys_avio_wait_ready(), row.result) << row.why;
        EXPECT_EQ(take_waits(), std::vector<int64_t>(row.sleeps, 29970030)) << row.why;
        EXPECT_TRUE(take_log().ends_with(row.log_end)) << row.why;
    }
    fail_call("nanosleep", 60, EINTR);
    EXPECT_EQ(vlsys_avio_wait_ready(), 0) << "a signal ends the wait";
    EXPECT_EQ(take_waits().size(), 60U);
    EXPECT_TRUE(logged(LOG_ERR, "timeout (2). "));
}

TEST_F(Device, DestinationAndRateComeFromTheAliveRegister) {
    const struct {
        const char *why, *alive, *destination;
        int rate;
        const char *warnings;
    } rows[] = {
        {"SY", "13", "SY", 59, ""},
        {"CN", "25", "CN", 50, ""},
        {"CN at 59.94", "23", "CN", 59, ""},
        {"no rate", "11", "SY", 59, "unknown fps: 0, fallback to 59\n"},
        {"both rates", "27", "CN", 50, "unknown fps: 3, fallback to 50\n"},
        {"no destination", "cd", "SY", 50, "unknown destination: 0, fallback to \"SY\"\n"},
    };
    for (const auto &row : rows) {
        set_status(krd31 + "Alive  : " + row.alive + "\n");
        vlsys_avio_scan_alive();
        char destination[3] = "";
        EXPECT_EQ(vlsys_get_destination(destination, sizeof destination), 2);
        EXPECT_STREQ(destination, row.destination) << row.why;
        take_log();
        EXPECT_EQ(vlsys_get_fps(), row.rate) << row.why;
        EXPECT_EQ(take_log(LOG_WARNING), row.warnings) << row.why;
    }
}

TEST_F(Device, WithoutADriverTheUnitIsTakenForSy) {
    unlink("/proc/driver/VlAvio/status");
    EXPECT_EQ(vlsys_avio_scan_alive(), 0x400);
    EXPECT_EQ(vlsys_get_fps(), 59);
    EXPECT_TRUE(logged(LOG_WARNING, "avio_status is not initialized. rescan status"));
    EXPECT_TRUE(logged(LOG_WARNING, "can't get VlAvio status. Emulator ?"));
    EXPECT_TRUE(logged(LOG_INFO, "Frame Frequency: unknown, Destination: unknown"));
    set_status(krd31 + tbx204 + tbx205 + tbx206);
    EXPECT_EQ(vlsys_get_hdcp_capability(), 1) << "the status is asked again";
}

TEST_F(Device, TheSerialNumberIsTakenFromTheListing) {
    const struct {
        string why, listing;
        int result;
        const char *serial;
    } rows[] = {
        {"as the tool prints it", "Board : KRD-31\nMainSerialNumber : 41600123\n0\n", 8,
         "41600123"},
        {"the last one counts", "MainSerialNumber:1 2\nMainSerialNumber\t22\n0", 2, "22"},
        {"no number", "MainSerialNumber :\n0\n", 5, "00000"},
        {"no such line", "Board MainSerialNumber : 1\nMainSerialNumbers : 1\n0\n", 0, "unchanged"},
        {"cut", "MainSerialNumber : 12345678901234567890\n0\n", 20, "123456789012345"},
        {"in a long line's second piece", string(8191, 'x') + "MainSerialNumber : 1\n0\n", 0,
         "unchanged"},
        {"the tool failed", "MainSerialNumber : 5\n9\n256\n", -201, "5"},
        {"a signal ended it", "MainSerialNumber : 5\n \t139 256\n", -339, "5"},
    };
    for (const auto &row : rows) {
        const ScriptedSurrogate surrogate("7\n", Then::await_start, row.listing);
        char serial[16] = "unchanged";
        EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), row.result) << row.why;
        EXPECT_STREQ(serial, row.serial) << row.why;
    }
    write_file("/usr/bin/Tovrin", "echo MainSerialNumber : 5\nexit 3\n");
    EXPECT_EQ(vlsys_get_serial_number(nullptr, 0), -301 - (3 << 8)) << "no surrogate parent";
}

TEST_F(Device, ASignalDoesNotCutTheListing) {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr); // without SA_RESTART
    write_file("/usr/bin/Tovrin", "sleep 0.2\necho MainSerialNumber : 5\n");
    ualarm(50000, 50000);
    char serial[16] = "";
    EXPECT_EQ(vlsys_get_serial_number(serial, sizeof serial), 1);
    ualarm(0, 0);
    EXPECT_STREQ(serial, "5");
}

TEST_F(Device, TheVersionFallsBackOnWhatIsMissing) {
    const struct {
        const char *why, *arrange, *version;
        time_t time;
    } rows[] = {
        {"the first line", "printf '2.5 b\\n2\\n' >$f; touch -d @7 $f", "2.5 b", 7},
        {"an empty line of no time", "echo >$f; touch -d @0 $f", "", 1361778840},
        {"no file", "rm $f", "1.00_SQA3", 1361778840},
    };
    for (const auto &row : rows) {
        run(string("f=/etc/velmora-version; ") + row.arrange);
        char version[16] = "";
        time_t time = 0;
        vlsys_get_version(version, sizeof version, &time);
        EXPECT_STREQ(version, row.version) << row.why;
        EXPECT_EQ(time, row.time) << row.why;
    }
}
