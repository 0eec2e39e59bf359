#include "netconf/keys.h"

#include "vlsys.h"

#include <algorithm>
#include <cstdio>
#include <iterator>

namespace vlsys {

void ItemList::add(const edit_item &item) {
    if (count_ < array_.size())
        array_[count_] = item;
    count_++;
}

std::span<const edit_item> ItemList::items() const {
    if (count_ > array_.size())
        return {};
    return array_.first(count_);
}

// sysctl parts a name at its dots, so a dot in the interface's own name is written "/".
SwitchKey switch_key(const char *interface, const char *name) {
    char own_name[VLSYS_IFNAME_SIZE] = {};
    vlsys_strlcpy(own_name, interface, sizeof own_name);
    std::replace(std::begin(own_name), std::end(own_name), '.', '/');
    SwitchKey key;
    snprintf(key.text, sizeof key.text, "net.ipv6.conf.%s.%s ", own_name, name);
    return key;
}

} // namespace vlsys
