#include "records.h"

#include <sstream>

namespace test {

using std::string;

std::map<string, Field> fields_of(Records &r) {
    std::map<string, Field> fields = {{"gw4", r.gw4.addr},          {"gw4.iface", r.gw4.iface},
                                      {"gw4.mode", r.gw4.mode},     {"gw6", r.gw6.addr},
                                      {"gw6.iface", r.gw6.iface},   {"gw6.mode", r.gw6.mode},
                                      {"dns", r.dns.mode},          {"domain", r.dns.domain},
                                      {"server0", r.dns.server[0]}, {"server1", r.dns.server[1]},
                                      {"server2", r.dns.server[2]}, {"dns.iface", r.dns.iface},
                                      {"hostname", r.text},         {"step", r.step}};
    string owner;
    for (vlsys_ifconf &nif : r.nifs) {
        fields.insert({{owner + "name", nif.name},
                       {owner + "ipv4", nif.ipv4_mode},
                       {owner + "addr", nif.addr},
                       {owner + "netmask", nif.netmask},
                       {owner + "prefix", nif.prefix},
                       {owner + "broadcast", nif.broadaddr},
                       {owner + "ipv6", nif.ipv6_mode},
                       {owner + "addr6", nif.addr6[0].addr},
                       {owner + "prefix6", nif.addr6[0].prefix}});
        owner = "eth1.";
    }
    return fields;
}

static void set_field(const Field &field, const string &value) {
    static const std::map<string, uint32_t> names = {{"Off", VLSYS_MODE_OFF},
                                                     {"Manual", VLSYS_MODE_MANUAL},
                                                     {"DHCP", VLSYS_MODE_DHCP},
                                                     {"Auto", VLSYS_MODE_AUTO},
                                                     {"Check", VLSYS_STEP_CHECK}};
    if (!field.is_number()) {
        vlsys_strlcpy(field.at, value.c_str(), field.size);
        return;
    }
    const auto number =
        static_cast<uint32_t>(names.contains(value) ? names.at(value) : std::stoul(value));
    if (field.size == 1)
        *field.at = static_cast<char>(number);
    else
        memcpy(field.at, &number, sizeof number);
}

Records make(const string &changes) {
    static const string start =
        "name=eth0 ipv4=Manual addr=10.0.0.10 netmask=255.255.255.0 prefix=24 "
        "broadcast=10.0.0.255 ipv6=Manual addr6=2001:db8::1 prefix6=64 "
        "eth1.name=eth1 eth1.addr=10.1.0.1 eth1.netmask=255.255.0.0 eth1.prefix=16 "
        "eth1.broadcast=10.1.255.255 eth1.addr6=fd00::1 eth1.prefix6=64 "
        "gw4.mode=Manual gw4=10.0.0.9 gw4.iface=eth0 gw6.mode=Manual gw6=fe80::1%eth0 "
        "dns=Manual domain=a.example server0=10.0.0.9 dns.iface=eth0 hostname=unit ";
    Records records = {};
    const auto fields = fields_of(records);
    std::istringstream words(start + changes);
    for (string word; words >> word;) {
        const size_t equals = word.find('=');
        set_field(fields.at(word.substr(0, equals)), word.substr(equals + 1));
    }
    return records;
}

} // namespace test
