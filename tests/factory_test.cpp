#include "fixture.h"

using namespace test;
using std::string;

using Factory = Unit;

static void make_unit(const string &kind) {
    unit::make_unit_files(kind.c_str());
    set_interfaces({"eth0", "eth1", "virbr0"});
    run("ln -sf true /usr/bin/fc-cache");
}

TEST_F(Factory, TheUnitIsSetUpForItsDestination) {
    run("surrogate-parent");
    make_unit("cn");
    const Files before = unit_files();
    run(FACTORY_PROGRAM);
    EXPECT_EQ(changes(before),
              "localtime +link to /usr/share/zoneinfo/Asia/Shanghai "
              "-link to /usr/share/zoneinfo/UTC "
              "clock +ZONE=\"Asia/Shanghai\" "
              "network +HOSTNAME=rhx416-41600123 -GATEWAY "
              "ifcfg-eth0 +ONBOOT=no +IPV6INIT=no +IPV6_AUTOCONF=no +NM_CONTROLLED=no +DEFROUTE=no "
              "+PEERDNS=no -UUID -HWADDR "
              "ifcfg-eth1 +DEFROUTE=no +PEERDNS=no "
              "velmora +net.ipv6.conf.eth0.disable_ipv6 = 1 "
              "+net.ipv6.conf.eth0.accept_ra_defrtr = 0 +net.ipv6.conf.eth1.accept_ra_defrtr = 0 ");
}

TEST_F(Factory, TheFirstFailureEndsTheTool) {
    const std::map<string, string> errors = {
        {"rm /etc/sysconfig/clock", "factory_init_timezone 42\n"},
        {"ip link del eth0", "factory_init_network 74\n"},
        {"echo exit 3 >/usr/bin/Tovrin",
         "factory_make_hostname 53\nERROR: factory.cpp factory_init_network 90\n"},
        {"echo 'echo \"MainSerialNumber: ;/run/x\"' >/usr/bin/Tovrin", "factory_init_network 90\n"},
        {"ln -sf false /usr/bin/fc-cache", "main 125\n"},
    };
    for (const auto &[cause, error] : errors) {
        make_unit("cn");
        run(cause);
        EXPECT_EQ(WEXITSTATUS(system(FACTORY_PROGRAM " >/run/lines")), 255) << cause;
        EXPECT_EQ(read_file("/run/lines"),
                  "dest: CN\ntimezone: Asia/Shanghai\nERROR: factory.cpp " + error)
            << cause;
    }
}

TEST_F(Factory, NeitherAPipeNorAnIgnoredSignalDisturbsTheTool) {
    make_unit("sy");
    // There is a serial number only when the tool's first line comes through the pipe while it
    // runs.
    write_file("/usr/bin/Tovrin",
               "timeout 9 sh -c 'until grep -q dest: /run/lines; do sleep 0.1; done' && "
               "echo MainSerialNumber : 1234567890");
    run("env --ignore-signal=CHLD " FACTORY_PROGRAM " | head -n 1 >/run/lines");
    EXPECT_EQ(read_file("/etc/sysconfig/network"), "NETWORKING=yes\nHOSTNAME=rhx416-12345678\n");
    make_unit("sy");
    run("echo >/usr/bin/Tovrin");                        // no serial number
    run("(sleep 0.3; exec " FACTORY_PROGRAM ") | true"); // and nobody reads any more
    EXPECT_EQ(read_file("/etc/sysconfig/network"), "NETWORKING=yes\nHOSTNAME=rhx416-00000\n");
}

TEST_F(Factory, OutputToAClosedDescriptorReachesNoFile) {
    make_unit("sy");
    run(FACTORY_PROGRAM " >&-");
    run("! grep -r dest: /etc/sysconfig"); // the tool prints "dest: SY"
    EXPECT_EQ(take_log().find("dest: "), string::npos);
}
