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
#include <sys/syscall.h>
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

// For what a machine may refuse altogether.
static void check_allowed(bool good, const std::string &what) {
    check(good,
          "no namespaces here (start it as root, in `docker run --privileged`, or on a machine "
          "of its own): " +
              what);
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

static constexpr int namespaces = CLONE_NEWNS | CLONE_NEWNET | CLONE_NEWUTS | CLONE_NEWPID;

static void mount_on(const std::string &path, const char *type, unsigned long flags = 0) {
    const char *const options = strcmp(type, "tmpfs") == 0 ? "mode=755" : nullptr;
    check(mount("unit", path.c_str(), type, flags, options) == 0, "mount " + path);
}

// A container that hides parts of /proc or /sys may grant a user namespace and refuse these mounts.
static int mount_kernel_files(void * /*unused*/) {
    return mount("unit", "/proc", "proc", 0, nullptr) == 0 &&
                   mount("unit", "/sys", "sysfs", MS_RDONLY, nullptr) == 0
               ? 0
               : 1;
}

static bool user_namespaces_work() {
    alignas(16) static char stack[65536];
    const pid_t probe = clone(mount_kernel_files, stack + sizeof stack,
                              CLONE_NEWUSER | namespaces | SIGCHLD, nullptr);
    int status = 0;
    return probe > 0 && waitpid(probe, &status, 0) == probe && status == 0;
}

// Root in a chroot or in a container may have no user namespace, and needs none.
static void become_root() {
    const std::string uid = std::to_string(geteuid());
    const std::string gid = std::to_string(getegid());
    if (!user_namespaces_work()) {
        check_allowed(unshare(namespaces) == 0, "unshare");
        return;
    }
    check(unshare(CLONE_NEWUSER | namespaces) == 0, "unshare");
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

// In a chroot "/" is no mount point: its mount, which may be shared with the machine, is made
// private from the true root, and "/" is bound onto itself.
static void make_chroot_private() {
    const std::string directory = fs::current_path();
    const int root = open("/", O_PATH | O_DIRECTORY | O_CLOEXEC);
    check(setns(static_cast<int>(syscall(SYS_pidfd_open, getpid(), 0)), CLONE_NEWNS) == 0, "setns");
    check(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "mount");
    const int bound = open_tree(root, "", AT_EMPTY_PATH | AT_RECURSIVE | OPEN_TREE_CLONE);
    check(move_mount(bound, "", root, "", MOVE_MOUNT_F_EMPTY_PATH | MOVE_MOUNT_T_EMPTY_PATH) == 0,
          "move_mount");
    check(fchdir(bound) == 0 && chroot(".") == 0 && chdir(directory.c_str()) == 0, "chroot");
    close(bound);
    close(root);
}

static void make_private() {
    if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0)
        return;
    check_allowed(errno == EINVAL, "mount /");
    make_chroot_private();
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
    make_private();
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
    // A neighbour that does not forward is no router: it would be a gateway until the first
    // traffic.
    run("ip link set lo up && sysctl -q -e -w net.ipv6.conf.all.forwarding=1");
    check(unshare(CLONE_NEWNET) == 0, "unshare(CLONE_NEWNET)");
    run("ip link set lo up");
    mount_on("/sys", "sysfs", MS_RDONLY);
}

void enter_namespaces() {
    setenv("PATH", UNIT_PROGRAMS ":/usr/sbin:/usr/bin:/sbin:/bin", 1);
    for (const char *name : {"TZ", "VL_ROOT", "VL_PREFIX", "VL_DATA"})
        unsetenv(name);
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
            // Not those of the clone, which depend on its maker's umask.
            const bool is_program = access(entry.path().c_str(), X_OK) == 0;
            fs::permissions(target, fs::perms{is_program ? 0755U : 0644U}, error);
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
    for (const char *path : {"/etc/sysconfig", "/etc/sysctl.d", "/etc/localtime",
                             "/etc/resolv.conf", "/run/advertisement-delay"})
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
        name + " up && nsenter --net=/run/netns/outside ip link set " + name + " up");
}

void set_interfaces(const std::vector<std::string> &names) {
    std::set<std::string> missing(names.begin(), names.end());
    struct if_nameindex *const present = if_nameindex();
    for (const struct if_nameindex *entry = present; entry->if_name; ++entry)
        if (missing.erase(entry->if_name) == 0 && strcmp(entry->if_name, "lo") != 0)
            run(std::string("ip link del '") + entry->if_name + "'");
    if_freenameindex(present);
    for (const std::string &name : names)
        if (missing.contains(name))
            add_interface(name);
}

} // namespace unit
