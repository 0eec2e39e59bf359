// The sysconfig editor on any old file.
#include "netconf/edit.h"
#include "fuzz.h"

#include <fstream>

static std::string edit(const std::string &old) {
    static const vlsys::edit_item items[] = {{0, "ONBOOT", "no"}, {0, "NEW", ""}};
    const char *const directory = getenv("TMPDIR");
    CHECK(directory);
    const std::string path = std::string(directory) + "/edited";
    std::ofstream(path) << old;
    CHECK(vlsys::edit(path.c_str(), items, 2) == 0);
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
}

static void feed(const std::string &text) {
    const std::string edited = edit(text);
    CHECK(edit(edited) == edited);
    size_t next = 0;
    const std::vector<std::string> lines = lines_of(edited);
    for (const auto &line : lines_of(text)) {
        if (line.empty() || line[0] == '#')
            continue;
        CHECK(next < lines.size());
        const std::string key = line.substr(0, line.find('='));
        CHECK(lines[next] == line || (key == "ONBOOT" && lines[next] == "ONBOOT=no") ||
              (key == "NEW" && lines[next] == "NEW="));
        next++;
    }
    CHECK(lines.size() <= next + 2);
}
