// Font cache, directories, trees, block devices.
#include "fixture.h"
#include "vlsys.h"

using namespace test;
using std::string;

using FileUtil = Unit;

TEST_F(FileUtil, TheFontCacheCommandGivesTheResult) {
    const std::map<string, int> results = {{"256\n", 1}, {"9\n", 9}, {"-5\n", -EPROTO}};
    for (const auto &[reply, result] : results) {
        const ScriptedSurrogate surrogate(reply, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_fc_cache(), result);
    }
}

TEST_F(FileUtil, ADirectoryIsMadeWithItsParents) {
    ASSERT_EQ(chdir("/run"), 0);
    write_file("file", "");
    for (const char *path : {"/run/f/g//h/", "a/b", "file"})
        EXPECT_EQ(vlsys_mkdir(path, 0700), 0) << path;
    EXPECT_EQ(mode_of("a/b"), 0700U);
    EXPECT_EQ(vlsys_mkdir("file/x/y", 0750), -1);
    EXPECT_TRUE(logged(LOG_ERR, "mkdir(file/x, 0750): Not a directory"));
}

TEST_F(FileUtil, ATreeIsRemovedWithoutFollowingLinks) {
    ASSERT_EQ(chdir("/run"), 0);
    run("mkdir -p keep x/y && touch keep/file && mkfifo x/fifo && ln -s /run/keep x/y/link");
    EXPECT_EQ(vlsys_remove_tree("x"), 0);
    run("! ls -d x && ln -s keep link");
    EXPECT_EQ(vlsys_remove_tree("link/"), 0);
    EXPECT_EQ(list_directory("keep"), "file\n");
    run("mkdir -p x/mounted && mount -t tmpfs none x/mounted && touch x/mounted/file");
    EXPECT_EQ(vlsys_remove_tree("x"), EBUSY);
    EXPECT_EQ(take_log(), "3 rmdir x/mounted: Device or resource busy\n");
}

TEST_F(FileUtil, ABlockDevicesSizeIsReadFromItsSizeFile) {
    const struct {
        string name, folder, sectors;
        int64_t size;
    } rows[] = {
        {"sda", "sda", "8\n9\n", 4096},
        {"hdb2", "hdb/hdb2", "1\n", 512},
        {"sdaa1", "sdaa1", "18014398509481983\n", INT64_MAX},
        {"mmcblk0p1", "mmcblk0p1", "", 0},
    };
    for (const auto &row : rows) {
        run("mount -t tmpfs none /sys/block && mkdir -p /sys/block/" + row.folder);
        write_file("/sys/block/" + row.folder + "/size", row.sectors);
        run("touch /run/" + row.name + " && ln -sf " + row.name + " /run/disk");
        EXPECT_EQ(vlsys_get_block_device_size("/run/disk"), row.size) << row.name;
    }
}
