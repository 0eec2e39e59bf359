// Font cache, directories, trees, block devices.
#include "fixture.h"
#include "vlsys.h"

using namespace test;
using std::string;

using FileUtil = Unit;

TEST_F(FileUtil, TheFontCacheCommandGivesTheResult) {
    const struct {
        const char *why, *reply;
        int result;
    } rows[] = {{"it failed", "256\n", 1},
                {"a signal ended it", "9\n", 9},
                {"it was not run", "-5\n", -EPROTO}};
    ASSERT_EQ(chdir("/run"), 0);
    for (const auto &row : rows) {
        ScriptedSurrogate surrogate(row.reply, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_fc_cache(), row.result) << row.why;
        EXPECT_EQ(surrogate.received(), "/run\nfc-cache\n") << row.why;
    }
}

TEST_F(FileUtil, ADirectoryIsMadeWithItsParents) {
    run("mkdir /run/t && touch /run/t/file");
    ASSERT_EQ(chdir("/run/t"), 0);
    for (const char *path : {"/run/t/a/b/c", "/run//t/a//b/", "f/g", "file"})
        EXPECT_EQ(vlsys_mkdir(path, 0700), 0) << path;
    for (const char *made : {"a", "a/b", "a/b/c", "f", "f/g"})
        EXPECT_EQ(mode_of(made), 0700U) << made;
    EXPECT_EQ(vlsys_mkdir("file/x/y", 0750), -1);
    EXPECT_TRUE(logged(LOG_ERR, "mkdir(file/x, 0750): Not a directory"));
}

TEST_F(FileUtil, ATreeIsRemovedWithoutFollowingLinks) {
    ASSERT_EQ(chdir("/run"), 0);
    run("mkdir keep && touch keep/file");
    for (const char *path : {"/run/x", "x", "x/"}) {
        run("mkdir -p x/y/z && touch x/1 x/y/z/2 && mkfifo x/fifo && ln -s /run/keep x/y/link");
        EXPECT_EQ(vlsys_remove_tree(path), 0) << path;
        EXPECT_NE(access("x", F_OK), 0) << path;
    }
    EXPECT_EQ(list_directory("keep"), "file\n");
    EXPECT_EQ(take_log(), "");
    EXPECT_EQ(vlsys_remove_tree("keep/file"), 0) << "a file, from where the call began";
    EXPECT_EQ(list_directory("keep"), "");
    run("mkdir -p x/mounted && mount -t tmpfs none x/mounted && touch x/mounted/file");
    EXPECT_EQ(vlsys_remove_tree("x"), EBUSY);
    EXPECT_TRUE(logged(LOG_ERR, "rmdir x/mounted: Device or resource busy"));
    EXPECT_EQ(list_directory("x/mounted"), "file\n") << "another file system is not entered";
}

TEST_F(FileUtil, ABlockDevicesSizeIsReadFromItsSizeFile) {
    const struct {
        string why, name, file, sectors;
        int64_t size;
    } rows[] = {
        {"a disk", "sda", "sda/size", "8\n9\n", 4096},
        {"a partition", "hdb2", "hdb/hdb2/size", "1\n", 512},
        {"an empty file", "sdc1", "sdc/sdc1/size", "", 0},
        {"a disk with two letters", "sdaa1", "sdaa1/size", "1", 512},
        {"no disk's name", "mmcblk0p1", "mmcblk0p1/size", "3\n", 1536},
        {"the largest size", "sdb", "sdb/size", "18014398509481983\n", INT64_MAX},
        {"more than a number holds", "sdd", "sdd/size", "99999999999999999999\n", INT64_MAX},
    };
    run("mount -t tmpfs none /sys/block && mkdir /run/d");
    ASSERT_EQ(chdir("/run/d"), 0);
    for (const auto &row : rows) {
        run("mkdir -p $(dirname /sys/block/" + row.file + ") && touch " + row.name + " && ln -sf " +
            row.name + " disk");
        write_file("/sys/block/" + row.file, row.sectors);
        EXPECT_EQ(vlsys_get_block_device_size("disk"), row.size) << row.why;
        EXPECT_EQ(take_log(), "7 dev: " + row.name + "\n6 /sys/block/" + row.file + ": " +
                                  std::to_string(row.size) + "\n");
    }
    EXPECT_EQ(vlsys_realpath(nullptr, "disk", 0), 10);
    EXPECT_EQ(vlsys_get_block_device_size("none"), -ENOENT);
    EXPECT_EQ(take_log(), "3 realpath(none, NULL): No such file or directory\n");
    run("rm /sys/block/sda/size && mkdir /sys/block/sda/size && ln -sf sda disk");
    EXPECT_EQ(vlsys_get_block_device_size("disk"), -EISDIR) << "a file that cannot be read";
}
