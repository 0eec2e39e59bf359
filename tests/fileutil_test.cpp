#include "fixture.h"
#include "vlsys.h"

#include <unistd.h>

using namespace test;
using std::string;

using FileUtil = Unit;

TEST_F(FileUtil, ADirectoryIsMadeWithItsParents) {
    ASSERT_EQ(chdir("/run"), 0);
    for (const char *path : {"/", "/run/f/g//h/", "a/b"})
        EXPECT_EQ(vlsys_mkdir(path, 0700), 0) << path;
    run("test $(find f a -perm 700 | wc -l) = 5");
    write_file("file", "");
    EXPECT_EQ(vlsys_mkdir("file/x/y", 0750), -1);
    EXPECT_EQ(take_log(), "3 mkdir(file/x, 0750): Not a directory\n");
}

TEST_F(FileUtil, ATreeIsRemovedWithoutFollowingLinks) {
    ASSERT_EQ(chdir("/run"), 0);
    run("mkdir -p keep x/y && touch keep/file && mkfifo x/fifo && ln -s /run/keep x/y/link");
    EXPECT_EQ(vlsys_remove_tree("x"), 0);
    run("! ls -d x && ln -s keep link");
    EXPECT_EQ(vlsys_remove_tree("link/"), 0);
    EXPECT_EQ(access("keep/file", F_OK), 0);
    run("mkdir -p x/mounted && mount -t tmpfs none x/mounted && touch x/mounted/file");
    EXPECT_EQ(vlsys_remove_tree("x"), EBUSY);
    EXPECT_EQ(access("x/mounted/file", F_OK), 0) << "another file system";
    EXPECT_EQ(take_log(), "3 rmdir x/mounted: Device or resource busy\n");
}

TEST_F(FileUtil, ABlockDevicesSizeIsReadFromItsSizeFile) {
    const struct {
        string why, name, folder, sectors;
        int64_t size;
    } rows[] = {
        {"a disk", "sda", "sda", "8\n9\n", 4096},
        {"a partition", "hdb9", "hdb/hdb9", "1\n", 512},
        {"a longer name, a huge size", "sdaa1", "sdaa1", "18014398509481983\n", INT64_MAX},
        {"a size file without a number", "mmcblk0p1", "mmcblk0p1", "", 0},
    };
    for (const auto &row : rows) {
        const string folder = "/sys/block/" + row.folder;
        run("mount -t tmpfs none /sys/block && mkdir -p " + folder);
        write_file(folder + "/size", row.sectors);
        run("touch /run/" + row.name + " && ln -sf " + row.name + " /run/disk");
        EXPECT_EQ(vlsys_get_block_device_size("/run/disk"), row.size) << row.why;
        EXPECT_EQ(take_log(), "7 dev: " + row.name + "\n6 " + folder +
                                  "/size: " + std::to_string(row.size) + "\n")
            << row.why;
    }
}
