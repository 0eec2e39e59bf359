// The sysconfig editor: the old file, then keys and values; an empty value removes.
#include "netconf/edit.h"
#include "fuzz.h"

static std::string edited(const std::string &old, std::span<const vlsys::edit_item> items) {
    const std::string path = scratch + "/edited";
    std::ofstream(path) << old;
    assert(vlsys::edit_or_log(path.c_str(), items) == 0);
    return read_file(path);
}

static void check(Input &in) {
    std::string expected = "\n";
    std::istringstream old(in[0]);
    for (std::string line; std::getline(old, line);)
        if (!line.empty() && line[0] != '#')
            expected += line + (old.eof() ? "" : "\n");
    vlsys::edit_item items[8];
    size_t count = 0;
    for (size_t i = 1; i < 15; i += 2) {
        const std::string &key = in[i] = in[i].substr(0, in[i].find_first_of("=\n#\0", 0, 4));
        const std::string &value = in[i + 1] =
            in[i + 1].substr(0, in[i + 1].find_first_of("\n\0", 0, 2));
        if (key.empty() || std::count(&in[1], &in[i], key) > 0)
            continue;
        items[count++] = {value.empty(), in[i].c_str(), in[i + 1].c_str()};
        std::string line = key + "=";
        const size_t at = expected.find("\n" + line) + 1;
        line.append(value).append("\n");
        line.resize(value.empty() ? 0 : line.size());
        if (at > 0)
            expected.replace(at, expected.find('\n', at) + 1 - at, line);
        else if (!value.empty())
            expected += (expected.back() == '\n' ? "" : "\n") + line;
    }
    const std::string once = edited(in[0], {items, count});
    assert(once == expected.substr(1));
    const bool removes = std::any_of(items, items + count, [](auto &it) { return it.remove == 1; });
    assert(removes || edited(once, {items, count}) == once);
}
