#include "core/owners.h"
#include "fixture.h"
#include "vlsys.h"

#include <cerrno>
#include <cstring>
#include <unistd.h>

using namespace test;

class Core : public Unit {};

TEST_F(Core, PathsComeFromTheEnvironmentAtTheStart) {
    const char *const names[] = {"VL_ROOT", "VL_PREFIX", "VL_DATA"};
    const auto getters = {vlsys_get_path_root, vlsys_get_path_prefix, vlsys_get_path_data};
    const std::pair<std::vector<const char *>, std::vector<std::string>> cases[] = {
        {{nullptr, nullptr, nullptr}, {"", "/usr", "/velmora"}},
        {{"/mnt/sys", nullptr, nullptr}, {"/mnt/sys", "/mnt/sys/usr", "/mnt/sys/velmora"}},
        {{"/r/", "/p", ""}, {"/r/", "/r//p", "/r/"}}};
    for (const auto &[values, paths] : cases) {
        vlsys_exit();
        for (size_t i = 0; i < 3; i++)
            values[i] ? setenv(names[i], values[i], 1) : unsetenv(names[i]);
        ASSERT_EQ(vlsys_init(), 0);
        EXPECT_TRUE(take_log().starts_with("6 vlsys " VLSYS_VERSION " "));
        setenv("VL_ROOT", "/changed", 1);
        EXPECT_EQ(vlsys_init(), 0);
        EXPECT_EQ(take_log(), "7 initialized 1 times\n");
        auto path = paths.begin();
        for (const auto getter : getters) {
            char text[64];
            EXPECT_EQ(getter(text, sizeof text), static_cast<int64_t>(path->length()));
            EXPECT_EQ(text, *path++);
        }
    }
    unsetenv("VL_ROOT");
}

TEST_F(Core, PathGettersSayTheWholeLength) {
    char text[] = "unchanged";
    EXPECT_EQ(vlsys_get_path_data(nullptr, 0), 8);
    EXPECT_EQ(vlsys_get_path_data(text, 0), 0);
    EXPECT_STREQ(text, "unchanged");
    EXPECT_EQ(vlsys_get_path_data(text, 4), 8);
    EXPECT_STREQ(text, "/ve");
    vlsys_exit();
    EXPECT_EQ(vlsys_get_path_data(text, sizeof text), -200);
    EXPECT_STREQ(text, "/ve");
}

TEST_F(Core, BoundedTextIsCutAndTerminated) {
    char text[8] = "1234567";
    EXPECT_EQ(vlsys_strlcpy(text, "abcdefghij", 4), 10U);
    EXPECT_EQ(memcmp(text, "abc\0", 4), 0);
    EXPECT_EQ(vlsys_strlcpy(text, "xyz", 0), 3U);
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 8), 13U);
    EXPECT_STREQ(text, "abc0123");
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 3), 13U);
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 0), 10U);
    EXPECT_STREQ(text, "abc0123");
}

// What a call writes to standard output.
template <class Call>
static std::string output_of(Call call) {
    char *text = nullptr;
    size_t size = 0;
    FILE *const before = std::exchange(stdout, open_memstream(&text, &size));
    call();
    fclose(std::exchange(stdout, before));
    return vlsys::Text(text).get();
}

TEST_F(Core, SystemLogLinesCarryIdentityProcessAndThread) {
    errno = ENOENT;
    vlsys_log(LOG_ERR, nullptr);
    __extension__ vlsys_log(LOG_ERR, "open(%s): %m", "x");
    EXPECT_EQ(errno, ENOENT);
    const auto raw = take_raw_log();
    ASSERT_EQ(raw.size(), 1U);
    const std::string id = std::to_string(getpid());
    EXPECT_EQ(raw[0].substr(0, 5), "<131>"); // local0.err
    EXPECT_EQ(raw[0].substr(raw[0].find("vlsys-tests")),
              "vlsys-tests[" + id + "]: [" + id + "]: open(x): No such file or directory");

    const int opened = open_descriptors();
    vlsys_closelog();
    EXPECT_EQ(open_descriptors(), opened - 1);
    unlink("/dev/log");
    vlsys_log(LOG_INFO, "%s", std::string(1 << 20, 'x').c_str()); // lost, and no more
    EXPECT_EQ(vlsys_setlogmask(LOG_UPTO(LOG_ERR)), 0xFF);
    EXPECT_EQ(vlsys_setlogmask(0xFF), LOG_UPTO(LOG_ERR));
}

TEST_F(Core, StandardOutputModeHasItsOwnLineFormat) {
    vlsys_openlog("myprog", 0, -1);
    const std::string id = std::to_string(getpid());
    EXPECT_EQ(output_of([] { vlsys_log(LOG_INFO, "hello %d", 1); }),
              "myprog[" + id + "]: <INFO>: [" + id + "]: hello 1\n");
    EXPECT_EQ(output_of([] { vlsys_log(LOG_LOCAL0 | LOG_DEBUG, "x"); }),
              "myprog[" + id + "]: <DEBUG>: [" + id + "]: x\n");
    EXPECT_EQ(output_of([] { vlsys_log(LOG_DEBUG, "bare\n"); }), "bare\n");
    EXPECT_EQ(output_of([] { vlsys_log(LOG_DEBUG, "%s", "bare\n"); }), "bare\n\n");
    vlsys_closelog();
    EXPECT_EQ(vlsys_setlogmask(LOG_UPTO(LOG_ERR)), 0xFF);
    EXPECT_EQ(output_of([] { vlsys_log(LOG_WARNING, "masked"); }), "");
    EXPECT_EQ(vlsys_setlogmask(0), LOG_UPTO(LOG_ERR));
    EXPECT_EQ(output_of([] { vlsys_log(LOG_EMERG, "masked"); }), "");
    EXPECT_EQ(take_raw_log().size(), 0U);
}
