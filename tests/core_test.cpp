// Start-up and paths, bounded text, the log.
#include "core/owners.h"
#include "fixture.h"
#include "vlsys.h"

#include <cerrno>
#include <cstring>
#include <unistd.h>

using namespace test;

using Core = Unit;

static std::string path_from(int64_t (*getter)(char *, size_t)) {
    char text[64] = "";
    const int64_t length = getter(text, sizeof text);
    EXPECT_EQ(length, static_cast<int64_t>(strlen(text)));
    return text;
}

// The root, prefix and data paths of a library started now.
static std::string paths() {
    vlsys_exit();
    EXPECT_EQ(vlsys_init(), 0);
    return path_from(vlsys_get_path_root) + " " + path_from(vlsys_get_path_prefix) + " " +
           path_from(vlsys_get_path_data);
}

TEST_F(Core, PathsComeFromTheEnvironmentAtTheStart) {
    EXPECT_EQ(paths(), " /usr /velmora") << "nothing is set";
    setenv("VL_ROOT", "/mnt", 1);
    EXPECT_EQ(paths(), "/mnt /mnt/usr /mnt/velmora");
    setenv("VL_ROOT", "/r/", 1);
    setenv("VL_PREFIX", "/p", 1);
    setenv("VL_DATA", "", 1);
    EXPECT_EQ(paths(), "/r/ /r//p /r/") << "texts are joined as they are";
    EXPECT_TRUE(take_log(LOG_INFO).starts_with("vlsys 1."));
    setenv("VL_ROOT", "/later", 1);
    EXPECT_EQ(vlsys_init(), 0) << "a second start changes nothing";
    EXPECT_TRUE(logged(LOG_DEBUG, "initialized 1 times"));
    EXPECT_EQ(path_from(vlsys_get_path_root), "/r/");
}

TEST_F(Core, APathGetterSaysTheWholeLength) {
    char text[] = "unchanged";
    EXPECT_EQ(vlsys_get_path_data(nullptr, 4), 8) << "no buffer";
    EXPECT_EQ(vlsys_get_path_data(text, 0), 0) << "no room";
    EXPECT_STREQ(text, "unchanged");
    EXPECT_EQ(vlsys_get_path_data(text, 4), 8) << "cut";
    EXPECT_STREQ(text, "/ve");
    vlsys_exit();
    EXPECT_EQ(vlsys_get_path_data(text, sizeof text), -200) << "not started";
    EXPECT_STREQ(text, "/ve");
}

TEST_F(Core, BoundedTextIsCutAndTerminated) {
    char text[8] = "1234567";
    EXPECT_EQ(vlsys_strlcpy(text, "abcdefghij", 4), 10U);
    EXPECT_EQ(std::string(text, 8), std::string("abc\000567", 8)) << "nothing beyond the size";
    EXPECT_EQ(vlsys_strlcpy(text, "xyz", 0), 3U);
    EXPECT_STREQ(text, "abc") << "no room";
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 8), 13U);
    EXPECT_STREQ(text, "abc0123");
    EXPECT_EQ(vlsys_strlcat(text, "0123456789", 3), 13U);
    EXPECT_STREQ(text, "abc0123") << "no NUL within the size";
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
    vlsys_log(LOG_ERR, nullptr); // ignored
    errno = ENOENT;
    __extension__ vlsys_log(LOG_ERR, "open(%s): %m", "x");
    EXPECT_EQ(errno, ENOENT);
    const std::string id = std::to_string(getpid());
    const auto raw = take_raw_log();
    ASSERT_EQ(raw.size(), 1U);
    EXPECT_TRUE(raw[0].starts_with("<131>")) << "facility local0, priority error: " << raw[0];
    EXPECT_TRUE(raw[0].ends_with(" vlsys-tests[" + id + "]: [" + id +
                                 "]: open(x): No such file or directory"))
        << raw[0];
    const int opened = open_descriptors();
    vlsys_closelog();
    EXPECT_EQ(open_descriptors(), opened - 1);
    EXPECT_EQ(vlsys_setlogmask(LOG_UPTO(LOG_ERR)), 0xFF);
    vlsys_log(LOG_WARNING, "masked");
    EXPECT_EQ(take_log(), "");
}

TEST_F(Core, StandardOutputLinesCarryTheirPriority) {
    vlsys_openlog("myprog", 0, -1);
    const std::string id = std::to_string(getpid());
    EXPECT_EQ(output_of([] { vlsys_log(LOG_INFO, "hello %d", 1); }),
              "myprog[" + id + "]: <INFO>: [" + id + "]: hello 1\n");
    EXPECT_EQ(output_of([] { vlsys_log(LOG_DEBUG, "bare\n"); }), "bare\n") << "its own line feed";
    EXPECT_EQ(output_of([] { vlsys_log(LOG_DEBUG, "%s", ""); }), "\n");
    EXPECT_EQ(vlsys_setlogmask(LOG_UPTO(LOG_ERR)), 0xFF);
    EXPECT_EQ(output_of([] { vlsys_log(LOG_WARNING, "masked"); }), "");
    EXPECT_EQ(vlsys_setlogmask(0), LOG_UPTO(LOG_ERR));
    EXPECT_EQ(output_of([] { vlsys_log(LOG_EMERG, "masked"); }), "") << "no bit is set";
    EXPECT_EQ(take_log(), "");
}
