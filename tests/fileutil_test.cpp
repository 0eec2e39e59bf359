#include "fixture.h"
#include "vlsys.h"

using namespace test;
using std::string;

class FileUtil : public Unit {};

TEST_F(FileUtil, FontCacheGivesTheCommandsExitCode) {
    ASSERT_EQ(chdir("/run"), 0);
    for (auto [reply, code] : {std::pair{"0\n", 0}, {"256\n", 1}, {"9\n", 9}, {"-5\n", -EPROTO}}) {
        ScriptedSurrogate surrogate(reply, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_fc_cache(), code) << reply;
        EXPECT_EQ(surrogate.received(), "/run\nfc-cache\n");
    }
}

TEST_F(FileUtil, DirectoriesAreMadeWithTheirParents) {
    run("mkdir /run/t && touch /run/t/file");
    ASSERT_EQ(chdir("/run/t"), 0);
    for (const char *path : {"/run/t/a/b/c", "/run//t/a//b/", "f/g", "file"})
        EXPECT_EQ(vlsys_mkdir(path, 0700), 0) << path;
    for (const char *made : {"a", "a/b", "a/b/c", "f", "f/g"})
        EXPECT_EQ(mode_of(made), 0700U) << made;
    EXPECT_EQ(vlsys_mkdir("file/x/y", 0750), -1);
    EXPECT_EQ(vlsys_mkdir("/proc/none", 07), -1);
    EXPECT_EQ(take_log(), "3 mkdir(file/x, 0750): Not a directory\n"
                          "3 mkdir(/proc/none, 0007): No such file or directory\n");
}

TEST_F(FileUtil, TreesAreRemovedWithoutFollowingLinks) {
    ASSERT_EQ(chdir("/run"), 0);
    for (const char *path : {"/run/x", "x", "x/"}) {
        run("mkdir -p keep x/y/z x/empty && touch keep/file x/1 x/y/2 x/y/z/3 && mkfifo x/fifo && "
            "ln -s /run/keep x/y/link && ln -s nowhere x/dangling");
        EXPECT_EQ(vlsys_remove_tree(path), 0);
        EXPECT_EQ(access("x", F_OK), -1) << path;
    }
    EXPECT_EQ(vlsys_remove_tree("keep/file"), 0); // still there, and no directory
    run("mkdir -p x/mounted && mount -t tmpfs none x/mounted && touch x/mounted/file");
    EXPECT_EQ(vlsys_remove_tree("x"), EBUSY);
    EXPECT_EQ(take_log(), "3 rmdir x/mounted: Device or resource busy\n");
    EXPECT_EQ(list_directory("x/mounted"), "file\n"); // found from where the call began
}

TEST_F(FileUtil, BlockDeviceSizeIsReadFromTheNamesSizeFile) {
    const std::tuple<string, string, string, int64_t> cases[] = {
        {"sda", "/sys/block/sda/size", "8\n9\n", 4096},
        {"hdb2", "/sys/block/hdb/hdb2/size", "", 0},
        {"sdaa1", "/sys/block/sdaa1/size", "1", 512},
        {"mmcblk0p1", "/sys/block/mmcblk0p1/size", "18014398509481982\n", INT64_MAX - 1023},
        {"sd", "/sys/block/sd/size", "18014398509481983\n", INT64_MAX},
        {"sda1", "/sys/block/sda/sda1/size", "99999999999999999999999999999999\n", INT64_MAX},
    };
    run("mount -t tmpfs none /sys/block && cd /sys/block && mkdir -p sda/sda1 hdb/hdb2 sdaa1 "
        "mmcblk0p1 sd && mkdir /run/d && cd /run/d && touch sda hdb2 sdaa1 mmcblk0p1 sd sda1");
    ASSERT_EQ(chdir("/run/d"), 0);
    for (const auto &[name, file, sectors, size] : cases) {
        write_file(file, sectors);
        run("ln -sf " + name + " disk");
        EXPECT_EQ(vlsys_get_block_device_size("disk"), size);
        EXPECT_EQ(take_log(),
                  ("7 dev: " + name) + ("\n6 " + file) + (": " + std::to_string(size)) + "\n");
    }
    EXPECT_EQ(vlsys_realpath(nullptr, "disk", 0), 11);
    EXPECT_EQ(vlsys_get_block_device_size("none"), -ENOENT);
    EXPECT_EQ(take_log(), "3 realpath(none, NULL): No such file or directory\n");
}
