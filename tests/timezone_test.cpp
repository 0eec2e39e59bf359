// The time zone: the link, the clock file, the process.
#include "fixture.h"
#include "vlsys.h"

#include <fnmatch.h>

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
        {"ZONE= anywhere in a line", "Asia/Tokyo", "#ZONE=a\n\nTIMEZONE=b\n",
         "ZONE=\"Asia/Tokyo\"\n\nZONE=\"Asia/Tokyo\"\n"},
        {"no zone line, no line feed", "UTC", "B=2", "B=2\nZONE=\"UTC\"\n"},
        {"a NUL in it", "UTC", string("A\0ZON\n", 6), string("A\0ZON\n", 6) + "ZONE=\"UTC\"\n"},
        {"a long line's second piece", "UTC", line + "ZONE=1" + line,
         line + "ZONE=\"UTC\"\nxxxxxx"},
        {"a line cut to a piece", slow, "ZONE=1\nB=2\n", "ZONE=\"" + slow + "B=2\n"},
    };
    for (const auto &row : rows) {
        write_file(clock_file, row.before);
        EXPECT_EQ(vlsys_set_timezone(row.zone.c_str()), 0) << row.why;
        EXPECT_EQ(read_file(clock_file), row.after) << row.why;
        EXPECT_EQ(link_target("/etc/localtime"), zones + row.zone) << row.why;
        EXPECT_EQ(getenv("TZ"), row.zone) << row.why;
    }
}

TEST_F(Timezone, ZoneAndOffsetAreReadBack) {
    char text[16] = "";
    EXPECT_EQ(vlsys_set_timezone("Asia/Tokyo"), 0);
    EXPECT_EQ(vlsys_get_utc_offset(text, 6), 5U);
    EXPECT_STREQ(text, "+0900");
    write_file(clock_file, "ZONE=UTC\n#ZONE=\"a\"b\" x\nZONE=\"UTC\"\n");
    EXPECT_EQ(vlsys_get_timezone(text, sizeof text), 3U) << "the first with a quote, to the last";
    EXPECT_STREQ(text, "a\"b");
}

TEST_F(Timezone, AFailureChangesNothing) {
    const struct {
        string arrange, zone;
        int error;
        const char *log;
    } rows[] = {
        {":", "", ENOENT, ""},
        {":", string(4100, '/') + "UTC", ENAMETOOLONG, "3 open(*): File name too long\n"},
        {"echo TZ >/run/z", "../../../run/z", EIO, "3 read(*/run/z): Input/output *"},
        {":", "zone.tab", ENOENT, "3 *zoneinfo/zone.tab: is not tzfile\n"},
        {"mkdir '/run/$(x)'", "../../../run/$(x)/../../usr/share/zoneinfo/UTC", EINVAL,
         "3 open(*zoneinfo/UTC): Invalid *"},
        {"rm clock", "UTC", ENOENT, "3 fopen(\"*/clock\", \"r\"): No such *"},
        {"rm clock; mkdir clock", "UTC", EISDIR, "3 fgets(*/clock): Is a *"},
    };
    for (const auto &row : rows) {
        unit::make_unit_files("sy");
        run("cd /etc/sysconfig; " + row.arrange);
        const Files before = unit_files();
        EXPECT_EQ(vlsys_set_timezone(row.zone.c_str()), -row.error) << row.zone;
        const string log = take_log();
        EXPECT_EQ(fnmatch(row.log, log.c_str(), 0), 0) << row.log << ": " << log;
        EXPECT_EQ(changes(before), "") << row.log;
        EXPECT_EQ(getenv("TZ"), nullptr) << row.log;
    }
}
