// Start-up and paths, bounded text, the log.
#include "fixture.h"
#include "vlsys.h"

#include <cerrno>
#include <unistd.h>

using namespace test;

using Core = Unit;

TEST_F(Core, PathsComeFromTheEnvironmentAtTheStart) {
    char text[16] = "unchanged";
    EXPECT_EQ(vlsys_get_path_data(nullptr, 0), 8) << "no buffer";
    EXPECT_EQ(vlsys_get_path_data(text, 0), 0) << "no room";
    EXPECT_EQ(vlsys_get_path_prefix(nullptr, 0), 4) << "/usr";
    vlsys_exit();
    EXPECT_EQ(vlsys_get_path_data(text, sizeof text), VLSYS_NOT_STARTED);
    EXPECT_STREQ(text, "unchanged");
    setenv("VL_ROOT", "/r/", 1);
    setenv("VL_PREFIX", "/p", 1);
    EXPECT_EQ(vlsys_init(), 0);
    EXPECT_TRUE(take_log(LOG_INFO).starts_with("vlsys 1."));
    setenv("VL_ROOT", "/later", 1);
    EXPECT_EQ(vlsys_init(), 0) << "a second start changes nothing";
    EXPECT_TRUE(logged(LOG_DEBUG, "initialized 1 times"));
    EXPECT_EQ(vlsys_get_path_root(text, sizeof text), 3);
    EXPECT_STREQ(text, "/r/");
    EXPECT_EQ(vlsys_get_path_prefix(text, sizeof text), 5);
    EXPECT_STREQ(text, "/r//p") << "joined as they are";
    EXPECT_EQ(vlsys_get_path_data(text, 6), 11) << "the whole length";
    EXPECT_STREQ(text, "/r//v") << "cut";
}

TEST_F(Core, BoundedTextIsCutAndTerminated) {
    char text[] = "1234567";
    EXPECT_EQ(vlsys_strlcpy(text, "abcdefghij", 4), 10U);
    EXPECT_EQ(std::string(text, 7), std::string("abc\000567", 7)) << "nothing beyond the size";
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 8), 13U);
    EXPECT_STREQ(text, "abc0123");
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 3), 13U);
    EXPECT_STREQ(text, "abc0123") << "no NUL within the size";
}

TEST_F(Core, SystemLogLinesCarryIdentityProcessAndThread) {
    errno = ENOENT;
    __extension__ vlsys_log(LOG_ERR, "open(%s): %m", "x");
    EXPECT_EQ(errno, ENOENT);
    const std::string id = "[" + std::to_string(getpid()) + "]: ";
    const std::string line = take_raw_log().at(0);
    EXPECT_TRUE(line.ends_with(" vlsys-tests" + id + id + "open(x): No such file or directory"))
        << line;
    const int opened = open_descriptors();
    vlsys_closelog();
    EXPECT_EQ(open_descriptors(), opened - 1);
    vlsys_setlogmask(LOG_UPTO(LOG_ERR));
    vlsys_log(LOG_WARNING, "masked");
    EXPECT_EQ(take_log(), "");
}

TEST_F(Core, StandardOutputLinesCarryTheirPriority) {
    FILE *const output = std::exchange(stdout, fopen("/run/output", "w"));
    vlsys_openlog("myprog", 0, -1);
    errno = ENOENT;
    __extension__ vlsys_log(LOG_INFO, "open(%s): %m", "x");
    vlsys_log(LOG_DEBUG, "bare\n");
    const int mask = vlsys_setlogmask(LOG_MASK(LOG_ERR));
    vlsys_log(LOG_WARNING, "masked");
    fclose(std::exchange(stdout, output));
    EXPECT_EQ(mask, 0xFF);
    const std::string id = "[" + std::to_string(getpid()) + "]: ";
    EXPECT_EQ(read_file("/run/output"),
              "myprog" + id + "<INFO>: " + id + "open(x): No such file or directory\nbare\n");
    EXPECT_EQ(take_log(), "");
}
