#include "fixture.h"

#include "vlsys.h"

#include <array>
#include <csignal>
#include <cstring>
#include <fnmatch.h>
#include <sys/mount.h>

using namespace test;
using Timezone = Unit;

static const std::string zones = "/usr/share/zoneinfo/";
static const char clock_file[] = "/etc/sysconfig/clock";

TEST_F(Timezone, SetsLinkClockFileAndProcessAndReadsBack) {
    const std::string x79(79, 'x');
    const std::string zone_x79 = "ZONE=1" + x79;
    const std::string nul("A=1\0ZON\n", 8);
    const std::string slow =
        "./././././././././././././././././././././././././././././././././././UTC";
    char text[80] = "";
    run("ln -s stale /etc/localtime.new");
    for (const auto &[zone, before, after] : std::vector<std::array<std::string, 3>>{
             {"Asia/Shanghai", "ZONE=\"UTC\"\nUTC=true\n", "ZONE=\"Asia/Shanghai\"\nUTC=true\n"},
             {"UTC", "#ZONE=a\n\nTIMEZONE=b\n", "ZONE=\"UTC\"\n\nZONE=\"UTC\"\n"},
             {"UTC", nul + "B=2", nul + "B=2\nZONE=\"UTC\"\n"},
             {"UTC", x79 + zone_x79, x79 + "ZONE=\"UTC\"\nxxxxxx"},
             {slow, "ZONE=1\nB=2\n", "ZONE=\"" + slow + "B=2\n"}, // cut to 79 bytes
             {slow, "B=2\n", "B=2\nZONE=\"" + slow + "\"\n"}}) {
        write_file(clock_file, before);
        EXPECT_EQ(vlsys_set_timezone(zone.c_str()), 0);
        EXPECT_EQ(link_target("/etc/localtime"), zones + zone);
        EXPECT_EQ(read_file(clock_file), after);
        EXPECT_EQ(mode_of(clock_file), 0644U);
        EXPECT_STREQ(getenv("TZ"), zone.c_str());
        EXPECT_EQ(vlsys_get_utc_offset(text, 6), 5U);
        EXPECT_STREQ(text, zone == "Asia/Shanghai" ? "+0800" : "+0000");
        EXPECT_EQ(vlsys_get_timezone(text, sizeof text), zone.size());
        EXPECT_EQ(text, zone);
    }
    write_file(clock_file, "ZONE=UTC\n#ZONE=\"a\"b\" x\nZONE=\"UTC\"\n");
    EXPECT_EQ(vlsys_get_timezone(text, sizeof text), 3U);
    EXPECT_STREQ(text, "a\"b");
    run("mount -t tmpfs zones /usr/share/zoneinfo; echo TZif >'/usr/share/zoneinfo/\"Q\"'");
    EXPECT_EQ(vlsys_set_timezone("\"Q\""), 0);
    EXPECT_EQ(read_file(clock_file), "ZONE=\"Q\"\nZONE=\"Q\"\nZONE=\"Q\"\n");
    run("umount /usr/share/zoneinfo");
    EXPECT_EQ(take_log(), "");
}

TEST_F(Timezone, AFailureChangesNothingFromThereOn) {
    signal(SIGXFSZ, SIG_IGN);
    unsetenv("TZ");
    using Row = std::tuple<std::string, const char *, int, std::string>;
    for (const auto &[arrange, zone, error, log] :
         {Row{":", nullptr, EFAULT, ""}, Row{":", "", ENOENT, ""},
          Row{":", "No/Such", ENOENT, "3 open(*zoneinfo/No/Such): No such *"},
          Row{":", "Asia", EISDIR, "3 read(*zoneinfo/Asia): Is a *"},
          Row{"printf TZi >/run/z", "../../../run/z", EIO, "3 read(*/run/z): Input/output *"},
          Row{":", "zone.tab", ENOENT, "3 *zoneinfo/zone.tab: is not tzfile\n"},
          Row{"mkdir ../localtime.new", "UTC", EISDIR, "3 unlink(/etc/localtime.new): *"},
          Row{"rm -r ../localtime*; mkdir ../localtime", "UTC", EISDIR,
              "3 rename(*.new, *time): *"},
          Row{"rm clock", "EST", ENOENT, "3 fopen(\"*/clock\", \"r\"): No such *"},
          Row{"rm clock; mkdir clock", "EST", EISDIR, "3 fgets(*/clock): Is a *"},
          Row{"mount --bind clock clock", "EST", EBUSY, "3 rename(*/clock.*, */clock): *"},
          Row{"prlimit -p $PPID --fsize=0:", "EST", EFBIG, "3 fputs(UTC=true\n): *"}}) {
        unit::make_unit_files("sy");
        run("cd /etc/sysconfig; " + arrange + "; TZ=UTC ls -li >/run/before");
        const bool linked = zone && strcmp(zone, "EST") == 0;
        const std::string target = linked ? zones + zone : link_target("/etc/localtime");
        EXPECT_EQ(vlsys_set_timezone(zone), -error) << log;
        EXPECT_EQ(fnmatch(log.c_str(), take_log().c_str(), 0), 0) << log;
        EXPECT_EQ(link_target("/etc/localtime"), target) << log;
        run("TZ=UTC ls -li /etc/sysconfig | cmp - /run/before");
        EXPECT_EQ(getenv("TZ"), nullptr) << log;
        umount(clock_file);
    }
    run("prlimit -p $PPID --fsize=unlimited:");
}
