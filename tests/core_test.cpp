#include "fixture.h"
#include "vlsys.h"

#include <cerrno>
#include <unistd.h>

using namespace test;

using Core = Unit;

TEST_F(Core, PathsComeFromTheEnvironmentAtTheStart) {
    char text[16] = "";
    EXPECT_EQ(vlsys_get_path_prefix(nullptr, 0), 4) << "/usr is the default";
    EXPECT_EQ(vlsys_get_path_data(nullptr, 0), 8) << "/velmora is the default";
    EXPECT_EQ(vlsys_get_path_data(text, 0), 0) << "a buffer without room";
    vlsys_exit();
    EXPECT_EQ(vlsys_get_path_data(text, sizeof text), VLSYS_NOT_STARTED);
    setenv("VL_ROOT", "/run/r/", 1);
    setenv("VL_PREFIX", "/p", 1);
    EXPECT_EQ(vlsys_init(), 0);
    EXPECT_EQ(take_log(LOG_INFO).find("6 vlsys " VLSYS_VERSION " built on "), 0U);
    setenv("VL_ROOT", "/later", 1);
    EXPECT_EQ(vlsys_init(), 0) << "a second start changes nothing";
    EXPECT_EQ(take_log(), "7 initialized 1 times\n");
    EXPECT_EQ(vlsys_get_path_root(text, sizeof text), 7);
    EXPECT_EQ(vlsys_get_path_prefix(text, sizeof text), 9);
    EXPECT_STREQ(text, "/run/r//p") << "joined as they are";
    EXPECT_EQ(vlsys_get_path_data(text, 10), 15) << "the whole length";
    EXPECT_STREQ(text, "/run/r//v") << "cut";
    EXPECT_EQ(vlsys_set_hostname("unit"), 0);
    EXPECT_EQ(read_file("/run/r/etc/sysconfig/network"), "HOSTNAME=unit\n");
}

TEST_F(Core, NullArgumentsAreRefusedInSilence) {
    EXPECT_EQ(vlsys_set_netif("lo", nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_utc_offset(nullptr, 9), 0U);
    EXPECT_EQ(vlsys_pclose(nullptr), -1);
    EXPECT_EQ(vlsys_address_check(nullptr, nullptr, nullptr, nullptr, nullptr), EFAULT);
    EXPECT_EQ(vlsys_get_block_device_size(nullptr), -EFAULT);
    EXPECT_EQ(take_log(), "");
}

TEST_F(Core, SystemLogLinesCarryIdentityProcessAndThread) {
    errno = ENOENT;
    __extension__ vlsys_log(LOG_ERR, "open(%s): %m", "x"); // gcc: %m is no standard format
    EXPECT_EQ(errno, ENOENT);
    const std::string id = "[" + std::to_string(getpid()) + "]: ";
    const std::string line = take_raw_log().at(0);
    EXPECT_TRUE(line.ends_with(" vlsys-tests" + id + id + "open(x): No such file or directory"))
        << line;
}

TEST_F(Core, StandardOutputLinesCarryTheirPriority) {
    FILE *const output = std::exchange(stdout, fopen("/run/output", "w"));
    vlsys_openlog("me", 0, -1);
    errno = ENOENT;
    for (int priority = LOG_EMERG; priority < LOG_DEBUG; priority++)
        __extension__ vlsys_log(priority, "open(%s): %m", "x");
    vlsys_log(LOG_DEBUG, "bare\n");
    const int mask = vlsys_setlogmask(LOG_MASK(LOG_ERR));
    vlsys_log(LOG_WARNING, "masked");
    fclose(std::exchange(stdout, output));
    EXPECT_EQ(mask, 0xFF);
    const std::string id = "[" + std::to_string(getpid()) + "]: ";
    const std::string text = ">: " + id + "open(x): No such file or directory\n";
    std::string expected;
    for (const char *name : {"EMERG", "ALERT", "CRIT", "ERR", "WARN", "NOTICE", "INFO"})
        expected.append("me" + id + "<").append(name).append(text);
    EXPECT_EQ(read_file("/run/output"), expected + "bare\n");
    EXPECT_EQ(take_log(), "");
}
