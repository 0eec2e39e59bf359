#include "fixture.h"
#include "vlsys.h"

#include <fnmatch.h>

using namespace test;
using std::string;

using Timezone = Unit;

static const char clock_file[] = "/etc/sysconfig/clock";

TEST_F(Timezone, TheClockFileGetsTheZoneInEachZoneLine) {
    const struct {
        string why, zone, before, after;
    } rows[] = {
        {"ZONE= anywhere in a line", "Asia/Tokyo", "#ZONE=a\n\nTIMEZONE=b\n",
         "ZONE=\"Asia/Tokyo\"\n\nZONE=\"Asia/Tokyo\"\n"},
        {"no zone line, and no line feed at the end", "UTC", "B=2", "B=2\nZONE=\"UTC\"\n"},
    };
    for (const auto &row : rows) {
        write_file(clock_file, row.before);
        EXPECT_EQ(vlsys_set_timezone(row.zone.c_str()), 0) << row.why;
        EXPECT_EQ(read_file(clock_file), row.after) << row.why;
        EXPECT_EQ(unit_files().at("localtime"), "link to /usr/share/zoneinfo/" + row.zone + "\n")
            << row.why;
        EXPECT_STREQ(getenv("TZ"), row.zone.c_str()) << row.why;
    }
}

TEST_F(Timezone, ZoneAndOffsetAreReadBack) {
    char text[16] = "";
    EXPECT_EQ(vlsys_set_timezone("Asia/Tokyo"), 0);
    EXPECT_EQ(vlsys_get_utc_offset(text, 6), 5U);
    EXPECT_STREQ(text, "+0900");
    write_file(clock_file, "ZONE=UTC\n#ZONE=\"a\"b\" x\nZONE=\"UTC\"\n");
    EXPECT_EQ(vlsys_get_timezone(text, sizeof text), 3U);
    EXPECT_STREQ(text, "a\"b") << "of the first line with a quote, what stands before the last one";
}

TEST_F(Timezone, AFailureChangesNothing) {
    const struct {
        string why, zone;
        int error;
        const char *log;
    } rows[] = {
        {"no zone", "", ENOENT, ""},
        {"too long a path", string(4073, '/') + "UTC", ENAMETOOLONG, "3 open(*): File name too *"},
        {"a zone file of three bytes", "../../../run/z", EIO, "3 read(*/run/z): Input/output *"},
        {"a pipe", "../../../run/pipe", EIO, "3 read(*/run/pipe): Input/output *"},
        {"the system's own link", "../../../etc/localtime", ELOOP, "3 open(*): Too many *"},
        {"a link to localtime", "../../../run/localtime", ELOOP, "3 open(*): Too many *"},
        {"a file that is no zone", "../../../run/n", ENOENT, "3 */run/n: is not tzfile\n"},
        {"a zone that a shell would run", "a`b", EINVAL, "3 open(*zoneinfo/a`b): Invalid *"},
    };
    run("cd /run; echo TZ >z; echo no zone >n; mkfifo pipe; ln -s /etc/localtime localtime");
    const Files before = unit_files();
    for (const auto &row : rows) {
        EXPECT_EQ(vlsys_set_timezone(row.zone.c_str()), -row.error) << row.why;
        const string log = take_log();
        EXPECT_EQ(fnmatch(row.log, log.c_str(), 0), 0) << row.why << ": " << log;
        EXPECT_EQ(changes(before), "") << row.why;
        EXPECT_EQ(getenv("TZ"), nullptr) << row.why;
    }
    for (const char *zone : {"a$b", "a\\b", "a\nb", "a\"b"})
        EXPECT_EQ(vlsys_set_timezone(zone), -EINVAL) << zone;
}
