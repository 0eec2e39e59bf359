#include "fixture.h"

#include "standin/sandbox.h"

#include <sys/stat.h>
#include <unistd.h>

using namespace test;

// The tool in a unit of its own kind; the surrogate parent runs, the font cache is not rebuilt.
class Factory : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1", "eth10", "eth2", "virbr0"});
        unit::run(SURROGATE_PROGRAM);
        set_font_cache_status(0);
    }

    static void set_font_cache_status(int status) {
        unlink("/usr/bin/fc-cache");
        write_file("/usr/bin/fc-cache", "#!/bin/sh\nexit " + std::to_string(status) + "\n");
        ASSERT_EQ(chmod("/usr/bin/fc-cache", 0755), 0);
    }
};

static const std::string scripts = "/etc/sysconfig/network-scripts/ifcfg-";

TEST_F(Factory, SetsUpTheUnitForItsDestination) {
    const struct {
        const char *kind, *destination, *zone;
    } cases[] = {{"sy", "SY", "Etc/GMT"},
                 {"cn", "CN", "Asia/Shanghai"},
                 {"backup-boot", "SY", "Etc/GMT"},
                 {"no-driver", "SY", "Etc/GMT"}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.kind);
        unit::make_unit_files(c.kind);
        for (int again = 0; again < 2; again++) { // a second run changes nothing
            const Output tool = capture(FACTORY_PROGRAM);
            EXPECT_EQ(tool.text,
                      std::string("dest: ") + c.destination + "\ntimezone: " + c.zone + "\n");
            EXPECT_EQ(tool.status, 0);
            EXPECT_EQ(link_target("/etc/localtime"), std::string("/usr/share/zoneinfo/") + c.zone);
            EXPECT_EQ(read_file("/etc/sysconfig/clock"),
                      "# The time zone of the system is defined by this file.\n"
                      "ZONE=\"" +
                          std::string(c.zone) + "\"\nUTC=true\n");
            EXPECT_EQ(read_file("/etc/sysconfig/network"),
                      "NETWORKING=yes\nHOSTNAME=rhx416-41600123\n");
            EXPECT_EQ(read_file(scripts + "eth0"),
                      "DEVICE=eth0\nTYPE=Ethernet\nONBOOT=no\nBOOTPROTO=dhcp\nIPV6INIT=no\n"
                      "IPV6_AUTOCONF=no\nNM_CONTROLLED=no\nDEFROUTE=no\nPEERDNS=no\n");
            for (const std::string name : {"eth1", "eth2", "eth10"})
                EXPECT_EQ(read_file(scripts + name),
                          "DEVICE=" + name +
                              "\nTYPE=Ethernet\nONBOOT=no\nBOOTPROTO=none\n"
                              "DEFROUTE=no\nPEERDNS=no\n");
            EXPECT_EQ(
                read_file("/etc/sysctl.d/velmora"),
                "net.ipv6.conf.eth0.disable_ipv6 = 1\nnet.ipv6.conf.eth0.autoconf = 1\n"
                "net.ipv6.conf.eth0.accept_ra_defrtr = 0\nnet.ipv6.conf.eth1.accept_ra_defrtr = 0\n"
                "net.ipv6.conf.eth2.accept_ra_defrtr = 0\nnet.ipv6.conf.eth10.accept_ra_defrtr = "
                "0\n");
            EXPECT_EQ(list_directory("/etc/sysconfig"), "clock\nnetwork\nnetwork-scripts\n");
            EXPECT_EQ(list_directory("/etc/sysconfig/network-scripts"),
                      "ifcfg-eth0\nifcfg-eth1\nifcfg-eth10\nifcfg-eth2\n");
            EXPECT_EQ(list_directory("/etc/sysctl.d"), "velmora\n");
        }
    }
}

TEST_F(Factory, NamesTheUnitAfterWhatFitsOfItsSerialNumber) {
    const struct {
        const char *serial, *hostname;
    } cases[] = {{"1", "rhx416-1"},
                 {"12345678901", "rhx416-12345678"},
                 {"123456789012345678", "rhx416-12345678"}};
    for (const auto &c : cases) {
        write_file("/run/serial-number", c.serial);
        EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0);
        EXPECT_EQ(read_file("/etc/sysconfig/network"),
                  std::string("NETWORKING=yes\nHOSTNAME=") + c.hostname + "\n");
    }
    // A tool that lists no serial number, but succeeds.
    write_file("/usr/bin/Tovrin", "#!/bin/sh\necho 'Board : KRD-31'\n");
    EXPECT_EQ(capture(FACTORY_PROGRAM).status, 0);
    EXPECT_EQ(read_file("/etc/sysconfig/network"), "NETWORKING=yes\nHOSTNAME=rhx416-00000\n");
}

static std::string error(const char *function, int number) {
    return std::string("ERROR: factory.cpp ") + function + " " + std::to_string(number) + "\n";
}

static const std::string good_start = "dest: SY\ntimezone: Etc/GMT\n";

TEST_F(Factory, EndsAtTheFirstFailureOfAStep) {
    write_file("/run/serial-number", "");
    Output tool = capture(FACTORY_PROGRAM);
    EXPECT_EQ(tool.text,
              good_start + error("factory_make_hostname", 53) + error("factory_init_network", 90));
    EXPECT_EQ(tool.status, 255);
    EXPECT_EQ(read_file("/etc/sysconfig/network"),
              "NETWORKING=yes\nHOSTNAME=localhost.localdomain\n");
    EXPECT_NE(read_file(scripts + "eth10").find("PEERDNS=no\n"), std::string::npos);

    unit::make_unit_files("sy");
    set_font_cache_status(1);
    tool = capture(FACTORY_PROGRAM);
    EXPECT_EQ(tool.text, good_start + error("main", 125));
    EXPECT_EQ(tool.status, 255);
    EXPECT_EQ(read_file("/etc/sysconfig/network"), "NETWORKING=yes\nHOSTNAME=rhx416-41600123\n");

    set_interfaces({"eth1"});
    unit::make_unit_files("sy");
    const std::string before = read_file("/etc/sysconfig/network");
    tool = capture(FACTORY_PROGRAM);
    EXPECT_EQ(tool.text, good_start + error("factory_init_network", 74));
    EXPECT_EQ(tool.status, 255);
    EXPECT_EQ(read_file("/etc/sysconfig/network"), before);
}
