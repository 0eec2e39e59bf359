// The tool, run on stand-in units; the surrogate parent is up unless a test says otherwise.
#include "fixture.h"

using namespace test;
using std::string;

using Factory = Unit;

static void make_unit(const string &kind) {
    unit::make_unit_files(kind.c_str());
    set_interfaces({"eth0", "eth1", "virbr0"});
    run("ln -sf true /usr/bin/fc-cache");
}

// What it makes of the unit's other files.
static const string factory_state = R"(network
+HOSTNAME=rhx416-41600123
-GATEWAY
ifcfg-eth0
+ONBOOT=no
+IPV6INIT=no
+IPV6_AUTOCONF=no
+NM_CONTROLLED=no
+DEFROUTE=no
+PEERDNS=no
-UUID
-HWADDR
ifcfg-eth1
+DEFROUTE=no
+PEERDNS=no
velmora
+net.ipv6.conf.eth0.disable_ipv6 = 1
+net.ipv6.conf.eth0.accept_ra_defrtr = 0
+net.ipv6.conf.eth1.accept_ra_defrtr = 0
)";

TEST_F(Factory, SetsUpTheUnitForItsDestination) {
    const std::map<string, string> zones = {
        {"sy", "Etc/GMT"}, {"cn", "Asia/Shanghai"}, {"no-driver", "Etc/GMT"}};
    run(SURROGATE_PROGRAM);
    for (const auto &[kind, zone] : zones) {
        make_unit(kind);
        const Files before = unit_files();
        EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0) << kind;
        string expected = "localtime\n+-> /usr/share/zoneinfo/";
        expected.append(zone).append("\n--> /usr/share/zoneinfo/UTC\nclock\n+ZONE=\"");
        expected.append(zone).append("\"\n").append(factory_state);
        EXPECT_EQ(changes(before), expected) << kind;
    }
}

TEST_F(Factory, TheFirstFailureEndsIt) {
    const std::map<string, string> errors = {
        {"rm /etc/sysconfig/clock", "factory_init_timezone 42\n"},
        {"ip link del eth0", "factory_init_network 74\n"},
        {"echo exit 3 >/usr/bin/Tovrin",
         "factory_make_hostname 53\nERROR: factory.cpp factory_init_network 90\n"},
        {"echo 'echo \"MainSerialNumber: ;/run/x\"' >/usr/bin/Tovrin", "factory_init_network 90\n"},
        {"ln -sf false /usr/bin/fc-cache", "main 125\n"},
    };
    for (const auto &[arrange, error] : errors) {
        make_unit("cn");
        run(arrange);
        const Output tool = capture(FACTORY_PROGRAM);
        EXPECT_EQ(tool.text, "dest: CN\ntimezone: Asia/Shanghai\nERROR: factory.cpp " + error);
        EXPECT_EQ(tool.status, 255) << arrange;
    }
}

TEST_F(Factory, NeitherAPipeNorAnIgnoredSignalDisturbsIt) {
    make_unit("sy");
    write_file("/usr/bin/Tovrin", "sleep 0.5; grep -q timezone /run/lines && "
                                  "echo MainSerialNumber : 1234567890");
    EXPECT_EQ(capture("env --ignore-signal=CHLD " FACTORY_PROGRAM " | tee /run/lines").text,
              "dest: SY\ntimezone: Etc/GMT\n");
    EXPECT_EQ(read_file("/etc/sysconfig/network"), "NETWORKING=yes\nHOSTNAME=rhx416-12345678\n");
}
