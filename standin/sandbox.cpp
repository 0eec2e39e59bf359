#include "standin/sandbox.h"

#include "standin/kinds.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <net/if.h>
#include <sched.h>
#include <set>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace unit {

static const std::string host = "/run/host"; // the machine's files as they are, read-only

[[noreturn]] static void fail(const std::string &what, const char *why) {
    fprintf(stderr, "stand-in unit: %s: %s\n", what.c_str(), why);
    _exit(1);
}

static void check(bool good, const std::string &what) {
    if (!good)
        fail(what, strerror(errno));
}

static void check(const std::error_code &error, const std::string &what) {
    if (error)
        fail(what, error.message().c_str());
}

static void write(const std::string &path, const std::string &content) {
    std::ofstream file(path);
    file << content;
    file.close();
    check(file.good(), path);
}

void run(const std::string &command) {
    const int status = system(command.c_str());
    if (status != 0)
        fail(command, "failed");
}

// ---- Namespaces

static void become_root() {
    const std::string uid = std::to_string(geteuid());
    const std::string gid = std::to_string(getegid());
    check(unshare(CLONE_NEWUSER | CLONE_NEWNS | CLONE_NEWNET | CLONE_NEWUTS | CLONE_NEWPID) == 0,
          "unshare (are user namespaces allowed here? they are not in a chroot)");
    write("/proc/self/setgroups", "deny");
    write("/proc/self/uid_map", "0 " + uid + " 1");
    write("/proc/self/gid_map", "0 " + gid + " 1");
}

// Waits for the process, reaping whatever else ends meanwhile, and ends as it did.
[[noreturn]] static void end_with(pid_t process) {
    int status = 0;
    for (;;) {
        const pid_t ended = waitpid(-1, &status, 0);
        check(ended > 0 || errno == EINTR, "waitpid");
        if (ended == process)
            _exit(WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status));
    }
}

static void fork_and_wait() {
    const pid_t process = fork();
    check(process >= 0, "fork");
    if (process > 0)
        end_with(process);
    prctl(PR_SET_PDEATHSIG, SIGKILL);
}

static void mount_on(const std::string &path, const char *type) {
    const char *const options = strcmp(type, "tmpfs") == 0 ? "mode=755" : nullptr;
    check(mount("unit", path.c_str(), type, 0, options) == 0, "mount " + path);
}

static void make_read_only() {
    struct mount_attr attributes = {};
    attributes.attr_set = MOUNT_ATTR_RDONLY;
    check(mount_setattr(AT_FDCWD, "/", AT_RECURSIVE, &attributes, sizeof attributes) == 0,
          "mount_setattr");
}

// A private, writable directory whose entries are links to the machine's.
static void mirror(const std::string &directory) {
    mount_on(directory, "tmpfs");
    std::error_code error;
    for (const auto &entry : fs::directory_iterator(host + directory, error))
        check(symlink(entry.path().c_str(), (directory / entry.path().filename()).c_str()) == 0,
              entry.path());
    check(error, host + directory);
}

static void mount_all() {
    check(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "mount /");
    make_read_only();
    mount_on("/proc", "proc");
    mount_on("/proc/driver", "tmpfs");
    mount_on("/run", "tmpfs");
    mount_on("/var/cache", "tmpfs");
    check(mkdir(host.c_str(), 0755) == 0, host);
    check(mount("/", host.c_str(), nullptr, MS_BIND | MS_REC, nullptr) == 0, host);
    for (const char *directory : {"/etc", "/usr/bin", "/usr/sbin", "/dev"})
        mirror(directory);
}

static void make_networks() {
    check(mkdir("/run/netns", 0755) == 0, "/run/netns");
    write("/run/netns/outside", "");
    check(mount("/proc/self/ns/net", "/run/netns/outside", nullptr, MS_BIND, nullptr) == 0,
          "/run/netns/outside");
    run("ip link set lo up");
    check(unshare(CLONE_NEWNET) == 0, "unshare(CLONE_NEWNET)");
    run("ip link set lo up");
}

void enter_namespaces() {
    setenv("PATH", UNIT_PROGRAMS ":/usr/sbin:/usr/bin:/sbin:/bin", 1);
    become_root();
    fork_and_wait(); // into the PID namespace, as its init
    fork_and_wait(); // an init ignores the signals that end any other process
    mount_all();
    make_networks();
    check(sethostname("localhost", 9) == 0, "sethostname");
}

// ---- Files

// A link of a mirrored directory is replaced, not written through.
static void copy_files() {
    const fs::path files = UNIT_FILES;
    std::error_code error;
    for (const auto &entry : fs::recursive_directory_iterator(files, error)) {
        const fs::path target = "/" / entry.path().lexically_relative(files);
        if (entry.is_directory()) {
            fs::create_directories(target, error);
        } else {
            fs::remove(target, error);
            fs::copy_file(entry.path(), target, error);
        }
        check(error, target);
    }
    check(error, files);
}

void make_unit_files(const char *kind_name) {
    const Kind *const kind = find_kind(kind_name);
    if (!kind)
        fail(kind_name, "no such kind of unit");
    std::error_code error;
    for (const char *path :
         {"/etc/sysconfig", "/etc/sysctl.d", "/etc/localtime", "/etc/resolv.conf"})
        fs::remove_all(path, error);
    copy_files();
    check(symlink("/usr/share/zoneinfo/UTC", "/etc/localtime") == 0, "/etc/localtime");
    write("/run/serial-number", kind->serial ? "41600123\n" : "");
    fs::remove_all("/proc/driver/VlAvio", error);
    if (kind->driver) {
        check(mkdir("/proc/driver/VlAvio", 0755) == 0, "/proc/driver/VlAvio");
        write("/proc/driver/VlAvio/status", driver_status(*kind));
    }
}

// ---- Interfaces

static void add_interface(const std::string &name) {
    run("ip link add " + name + " type veth peer name " + name + " netns outside && ip link set " +
        name + " up && ip -n outside link set " + name + " up");
}

void set_interfaces(const std::vector<std::string> &names) {
    std::set<std::string> missing(names.begin(), names.end());
    struct if_nameindex *const present = if_nameindex();
    for (const struct if_nameindex *entry = present; entry->if_name; ++entry)
        if (missing.erase(entry->if_name) == 0 && strcmp(entry->if_name, "lo") != 0)
            run(std::string("ip link del ") + entry->if_name);
    if_freenameindex(present);
    for (const std::string &name : names)
        if (missing.contains(name))
            add_interface(name);
}

} // namespace unit
