// The tool, run on stand-in units; the surrogate parent is up unless a test says otherwise.
#include "fixture.h"

using namespace test;
using std::string;

class Factory : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1", "virbr0"});
        set_font_cache_command("exit 0");
    }

    static void set_font_cache_command(const string &command) {
        write_file("/run/fc-cache", "#!/bin/sh\n" + command + "\n");
        run("chmod +x /run/fc-cache && ln -sf /run/fc-cache /usr/bin/fc-cache");
    }
};

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
    const struct {
        const char *kind, *destination, *zone;
    } rows[] = {
        {"sy", "SY", "Etc/GMT"}, {"cn", "CN", "Asia/Shanghai"}, {"no-driver", "SY", "Etc/GMT"}};
    run(SURROGATE_PROGRAM);
    for (const auto &row : rows) {
        unit::make_unit_files(row.kind);
        const Files before = unit_files();
        const Output tool = capture(FACTORY_PROGRAM);
        EXPECT_EQ(tool.text, string("dest: ") + row.destination + "\ntimezone: " + row.zone + "\n");
        EXPECT_EQ(tool.status, 0) << row.kind;
        const Files after = unit_files();
        EXPECT_EQ(changes(before, after), string("localtime\n+-> /usr/share/zoneinfo/") + row.zone +
                                              "\n--> /usr/share/zoneinfo/UTC\nclock\n+ZONE=\"" +
                                              row.zone + "\"\n" + factory_state)
            << row.kind;
        EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0) << "a second time on " << row.kind;
        EXPECT_EQ(changes(after), "") << "a second time on " << row.kind;
    }
}

TEST_F(Factory, TheHostNameIsMadeOfTheSerialNumber) {
    const struct {
        const char *why, *listing, *hostname;
    } rows[] = {
        {"its first 8 characters", "MainSerialNumber : 1234567890", "rhx416-12345678"},
        {"there is none", "Board : KRD-31", "rhx416-00000"},
    };
    for (const auto &row : rows) {
        write_file("/usr/bin/Tovrin", string("#!/bin/sh\necho ") + row.listing + "\n");
        EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0) << row.why;
        EXPECT_EQ(read_file("/etc/sysconfig/network"),
                  string("NETWORKING=yes\nHOSTNAME=") + row.hostname + "\n");
    }
}

TEST_F(Factory, TheFirstFailureEndsIt) {
    const struct {
        const char *why, *arrange, *errors;
    } rows[] = {
        {"no clock file", "rm /etc/sysconfig/clock", "factory_init_timezone 42\n"},
        {"no interface", "ip link del eth0", "factory_init_network 74\n"},
        {"no serial number", "echo exit 3 >/usr/bin/Tovrin",
         "factory_make_hostname 53\nERROR: factory.cpp factory_init_network 90\n"},
        {"no font cache", "echo exit 1 >/run/fc-cache", "main 125\n"},
    };
    for (const auto &row : rows) {
        unit::make_unit_files("sy");
        set_interfaces({"eth0"});
        run(row.arrange);
        const Output tool = capture(FACTORY_PROGRAM);
        EXPECT_EQ(tool.text,
                  string("dest: SY\ntimezone: Etc/GMT\nERROR: factory.cpp ") + row.errors)
            << row.why;
        EXPECT_EQ(tool.status, 255) << row.why;
    }
}

TEST_F(Factory, EachLineComesAsItHappens) {
    set_font_cache_command(
        "for i in $(seq 500); do grep timezone /run/lines && exit; sleep 0.01; done; exit 1");
    EXPECT_EQ(capture(FACTORY_PROGRAM " | tee /run/lines").text, "dest: SY\ntimezone: Etc/GMT\n");
}

TEST_F(Factory, AParentThatIgnoresItsChildrensEndDoesNoHarm) {
    EXPECT_EQ(capture("exec env --ignore-signal=CHLD " FACTORY_PROGRAM).status, 0);
}
