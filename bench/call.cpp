// vlsys-call edit FILE KEY=VALUE...: one rewrite of a sysconfig file.
// vlsys-call make-tree PATH COUNT: a tree of that many files, a hundred to a directory.
// vlsys-call remove-tree PATH, vlsys-call remove-bare PATH: the library's removal, and bare calls.
#include "bench/bare.h"
#include "netconf/edit.h"
#include "vlsys.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

static int edit(const char *path, char **settings, int count) {
    vlsys::edit_item items[16] = {};
    for (int i = 0; i < count && i < 16; i++) {
        char *const equals = strchr(settings[i], '=');
        *equals = '\0';
        items[i].key = settings[i];
        items[i].value = equals + 1;
    }
    return vlsys::edit(path, items, static_cast<uint32_t>(count));
}

static int make_tree(const std::string &path, long count) {
    mkdir(path.c_str(), 0755);
    for (long i = 0; i < count; i++) {
        const std::string directory = path + "/" + std::to_string(i / 100);
        if (i % 100 == 0 && mkdir(directory.c_str(), 0755) != 0)
            return 1;
        const std::string file = directory + "/" + std::to_string(i);
        const int fd = open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL, 0644);
        if (fd < 0)
            return 1;
        close(fd);
    }
    return 0;
}

int main(int argc, char **argv) {
    const std::string call = argc > 2 ? argv[1] : "";
    if (call == "edit")
        return edit(argv[2], argv + 3, argc - 3) == 0 ? 0 : 1;
    if (call == "make-tree" && argc == 4)
        return make_tree(argv[2], strtol(argv[3], nullptr, 10));
    if (call == "remove-tree")
        return vlsys_remove_tree(argv[2]);
    if (call == "remove-bare")
        return remove_bare(argv[2]) ? 0 : 1;
    return 2;
}
