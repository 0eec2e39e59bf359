// The time zone: the link, the clock file, the process.
#include "fixture.h"
#include "vlsys.h"

#include <fnmatch.h>
#include <sys/mount.h>

using namespace test;
using std::string;

using Timezone = Unit;

static const string zones = "/usr/share/zoneinfo/";
static const char clock_file[] = "/etc/sysconfig/clock";

TEST_F(Timezone, TheClockFileGetsTheZoneInEachZoneLine) {
    const string line(79, 'x'); // what is read at once
    const string slow = "./././././././././././././././././././././././././././././././././././UTC";
    const struct {
        string why, zone, before, after;
    } rows[] = {
        {"a zone line", "Asia/Tokyo", "ZONE=\"UTC\"\nUTC=true\n",
         "ZONE=\"Asia/Tokyo\"\nUTC=true\n"},
        {"ZONE= anywhere in it", "UTC", "#ZONE=a\n\nTIMEZONE=b\n",
         "ZONE=\"UTC\"\n\nZONE=\"UTC\"\n"},
        {"no zone line", "UTC", "B=2\n", "B=2\nZONE=\"UTC\"\n"},
        {"no line feed at the end", "UTC", "B=2", "B=2\nZONE=\"UTC\"\n"},
        {"a NUL in it", "UTC", string("A\0ZON\n", 6), string("A\0ZON\n", 6) + "ZONE=\"UTC\"\n"},
        {"in a long line's second piece", "UTC", line + "ZONE=1" + line,
         line + "ZONE=\"UTC\"\nxxxxxx"},
        {"a line cut to a piece", slow, "ZONE=1\nB=2\n", "ZONE=\"" + slow + "B=2\n"},
        {"an appended line is not cut", slow, "B=2\n", "B=2\nZONE=\"" + slow + "\"\n"},
    };
    for (const auto &row : rows) {
        write_file(clock_file, row.before);
        EXPECT_EQ(vlsys_set_timezone(row.zone.c_str()), 0) << row.why;
        EXPECT_EQ(read_file(clock_file), row.after) << row.why;
        EXPECT_EQ(mode_of(clock_file), 0644U) << row.why;
        EXPECT_EQ(link_target("/etc/localtime"), zones + row.zone) << row.why;
        EXPECT_EQ(getenv("TZ"), row.zone) << row.why;
    }
    EXPECT_EQ(take_log(), "");
}

TEST_F(Timezone, ZoneAndOffsetAreReadBack) {
    char text[16] = "";
    EXPECT_EQ(vlsys_set_timezone("Asia/Tokyo"), 0);
    EXPECT_EQ(vlsys_get_timezone(text, sizeof text), 10U);
    EXPECT_STREQ(text, "Asia/Tokyo");
    EXPECT_EQ(vlsys_get_utc_offset(text, 6), 5U);
    EXPECT_STREQ(text, "+0900");
    EXPECT_EQ(vlsys_get_utc_offset(text, 5), 0U) << "no room";
    write_file(clock_file, "ZONE=UTC\n#ZONE=\"a\"b\" x\nZONE=\"UTC\"\n");
    EXPECT_EQ(vlsys_get_timezone(text, sizeof text), 3U) << "the first with a quote, to the last";
    EXPECT_STREQ(text, "a\"b");
}

TEST_F(Timezone, AFailureChangesNothingFromThereOn) {
    const string too_long = string(4100, '/') + "UTC\"\ntouch pwned\n";
    const struct {
        const char *why, *arrange, *zone;
        int error;
        const char *log;
        bool is_linked = false;
    } rows[] = {
        {"no zone", ":", nullptr, EFAULT, ""},
        {"an empty zone", ":", "", ENOENT, ""},
        {"no such zone", ":", "No/Such", ENOENT, "3 open(*zoneinfo/No/Such): No such *"},
        {"a path too long", ":", too_long.c_str(), ENAMETOOLONG, "3 open(*): File name too long\n"},
        {"a directory", ":", "Asia", EISDIR, "3 read(*zoneinfo/Asia): Is a *"},
        {"a short file", "echo TZ >/run/z", "../../../run/z", EIO,
         "3 read(*/run/z): Input/output *"},
        {"no zone file", ":", "zone.tab", ENOENT, "3 *zoneinfo/zone.tab: is not tzfile\n"},
        {"the new link is in the way", "mkdir ../localtime.new", "UTC", EISDIR,
         "3 unlink(/etc/localtime.new): *"},
        {"the link is a directory", "rm -r ../localtime*; mkdir ../localtime", "UTC", EISDIR,
         "3 rename(*.new, *time): *"},
        {"no clock file", "rm clock", "Etc/GMT", ENOENT, "3 fopen(\"*/clock\", \"r\"): No such *",
         true},
        {"a clock file that cannot be read", "rm clock; mkdir clock", "Etc/GMT", EISDIR,
         "3 fgets(*/clock): Is a *", true},
        {"one that cannot be replaced", "mount --bind clock clock", "Etc/GMT", EBUSY,
         "3 rename(*/clock.*, */clock): *", true},
    };
    for (const auto &row : rows) {
        unit::make_unit_files("sy");
        unsetenv("TZ");
        run(string("cd /etc/sysconfig; ") + row.arrange);
        const Files before = unit_files("/etc/sysconfig");
        const string target = row.is_linked ? zones + row.zone : link_target("/etc/localtime");
        EXPECT_EQ(vlsys_set_timezone(row.zone), -row.error) << row.why;
        const string log = take_log();
        EXPECT_EQ(fnmatch(row.log, log.c_str(), 0), 0) << row.why << ": " << log;
        EXPECT_EQ(link_target("/etc/localtime"), target) << row.why;
        EXPECT_EQ(changes(before, unit_files("/etc/sysconfig")), "") << row.why;
        EXPECT_EQ(getenv("TZ"), nullptr) << row.why;
        umount(clock_file);
    }
}

TEST_F(Timezone, AClockFileThatDoesNotReachTheDiskStaysAsItWas) {
    const string before = read_file(clock_file);
    fail_call("fsync", 1, EIO);
    EXPECT_EQ(vlsys_set_timezone("Asia/Tokyo"), -EIO);
    EXPECT_EQ(read_file(clock_file), before);
}
