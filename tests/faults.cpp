#include "faults.h"

#include "fixture.h"

#include <bit>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <netdb.h>
#include <pthread.h>
#include <sys/stat.h>
#include <tuple>
#include <unistd.h>

namespace test {

// Whether a call acquires a thing that must be released (a descriptor, memory, a list), or releases
// one. A release that fails has released it all the same.
enum class Holding { unchanged, acquires, releases };
using enum Holding;

struct Calls {
    std::string names;
    Word failure; // their result when they fail
    Holding holding;
    std::vector<int> errors;    // the errno values that they can fail with
    std::vector<int> unnoticed; // further ones, which the operation must make good
};

// Every call of the library that can fail or releases something. CMakeLists.txt takes the names
// from the beginnings of these lines.
static const Calls calls[] = {
    {"open mkostemp", -1, acquires, {EMFILE, EACCES}, {}},
    {"socket getifaddrs", -1, acquires, {EMFILE}, {}},
    {"vasprintf", -1, acquires, {ENOMEM}, {}},
    {"getaddrinfo", EAI_SYSTEM, acquires, {ENOMEM}, {}},
    {"fopen popen if_nameindex", 0, acquires, {EMFILE, ENOMEM}, {}},
    {"malloc calloc realloc strdup strndup fts_open realpath", 0, acquires, {ENOMEM}, {}},
    {"close", -1, releases, {EIO}, {EINTR}},
    {"fclose fts_close pclose", -1, releases, {EIO}, {}},
    {"free freeaddrinfo freeifaddrs if_freenameindex", 0, releases, {}, {}},
    {"read recv", -1, unchanged, {EIO}, {EINTR}},
    {"write", -1, unchanged, {EIO, ENOSPC}, {EINTR}},
    {"send", -1, unchanged, {EPIPE}, {EINTR}},
    {"connect", -1, unchanged, {ECONNREFUSED, ETIMEDOUT}, {EINTR}},
    {"fsync", -1, unchanged, {EIO, ENOSPC}, {EINVAL}},
    {"getxattr", -1, unchanged, {EIO}, {ENODATA, EOPNOTSUPP}},
    {"readlink", -1, unchanged, {}, {EINVAL}},
    {"fsetxattr fchmod chmod sethostname", -1, unchanged, {EPERM}, {}},
    {"rename unlink fstat", -1, unchanged, {EIO, EACCES}, {}},
    {"access lstat", -1, unchanged, {}, {ENOENT, EACCES}},
    {"symlink", -1, unchanged, {ENOSPC, EEXIST}, {}},
    {"mkdir rmdir", -1, unchanged, {ENOSPC, EROFS}, {}},
    {"setenv gethostname", -1, unchanged, {ENOMEM}, {}},
    {"fork system", -1, unchanged, {EAGAIN}, {}},
    {"fdopen fts_read getcwd localtime_r", 0, unchanged, {ENOMEM}, {}},
    {"if_nametoindex if_indextoname", 0, unchanged, {EMFILE}, {}},
    {"getnameinfo", EAI_SYSTEM, unchanged, {ENOMEM}, {}},
};

// A file that opens and cannot be read: fopen succeeds, the first read from the stream fails.
static const Calls reading = {"reading", 0, unchanged, {EIO}, {}};

static thread_local struct {
    Fault fault = Fault::none;
    int left =
        0; // counts down by call, with Fault::failure by way to fail; at 1 the next is struck
    Strike *strike = nullptr;
} plan;

static std::map<ino_t, off_t> flushed; // how many bytes of a file are on the disk
static std::vector<std::string> replaced;

// When a flush or a close fails, the file's content is lost. (What is no file has nothing to lose.)
static void lose_content(int descriptor) {
    [[maybe_unused]] const int result = ftruncate(descriptor, 0);
}

static void cut_power() {
    for (const auto &path : replaced) {
        struct stat status = {};
        if (fstatat(AT_FDCWD, path.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
            S_ISREG(status.st_mode) && truncate(path.c_str(), flushed[status.st_ino]) != 0)
            abort();
    }
}

// Kills the process when the plan says that this call is not reached.
static void kill_when_due(const std::string &name) {
    if (plan.fault != Fault::kill && plan.fault != Fault::power_cut)
        return;
    if (--plan.left > 0)
        return;
    name.copy(plan.strike->call, sizeof plan.strike->call - 1);
    if (plan.fault == Fault::power_cut)
        cut_power();
    raise(SIGKILL);
}

// The errno that the plan lets this call fail with; 0 when it lets it succeed.
static int choose_error(const std::string &name, const Calls &kind) {
    if (plan.fault != Fault::failure || plan.left <= 0)
        return 0;
    std::vector<int> ways = kind.errors;
    ways.insert(ways.end(), kind.unnoticed.begin(), kind.unnoticed.end());
    const auto way = static_cast<size_t>(plan.left - 1);
    plan.left -= static_cast<int>(ways.size());
    if (way >= ways.size())
        return 0;
    name.copy(plan.strike->call, sizeof plan.strike->call - 1);
    plan.strike->must_go_unnoticed = way >= kind.errors.size();
    plan.strike->error = ways[way];
    return ways[way];
}

// Its reads now fail with EIO, as those of a bad disk: so does a read of this process's address 0.
static void make_unreadable(FILE *file) {
    const int unreadable = open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
    dup3(unreadable, fileno(file), O_CLOEXEC);
    close(unreadable);
}

static void note_success(const std::string &name, const std::array<Word, 7> &arguments,
                         Word result) {
    struct stat status = {};
    if (name == "fsync" && fstat(static_cast<int>(arguments[0]), &status) == 0)
        flushed[status.st_ino] = status.st_size;
    if (name == "rename")
        replaced.emplace_back(std::bit_cast<const char *>(arguments[1]));
    if (name == "rename" && plan.fault == Fault::copy_etc)
        run("cp -a /etc /run/versions/$(ls /run/versions | wc -l)");
    if (name == "fopen" && choose_error("reading", reading) != 0)
        make_unreadable(std::bit_cast<FILE *>(result));
}

static int change_of_held(const std::string &name, Holding holding, Word first, bool has_failed) {
    if (holding == unchanged || (name == "free" && first == 0))
        return 0;
    if (holding == releases)
        return -1;
    const bool is_replaced = name == "realloc" && first != 0; // one thing for another
    return has_failed || is_replaced ? 0 : 1;
}

bool has_word(const std::string &words, const std::string &word) {
    return (" " + words + " ").find(" " + word + " ") != std::string::npos;
}

static const Calls &find_kind(const std::string &name) {
    for (const Calls &kind : calls)
        if (has_word(kind.names, name))
            return kind;
    abort();
}

Word intercept(const char *name, Function *real, const std::array<Word, 7> &arguments) {
    if (!plan.strike)
        return std::apply(real, arguments);
    const Calls &kind = find_kind(name);
    kill_when_due(name);
    const int error = choose_error(name, kind);
    if (error != 0 && !plan.strike->must_go_unnoticed && has_word("close fsync", name))
        lose_content(static_cast<int>(arguments[0]));
    const bool is_called = error == 0 || kind.holding == releases;
    const Word result = is_called ? std::apply(real, arguments) : kind.failure;
    if (!plan.strike)
        return result; // the call was fork, and this is the child
    const bool has_failed = kind.failure == 0 ? result == 0 : static_cast<int>(result) < 0;
    plan.strike->held += change_of_held(name, kind.holding, arguments[0], has_failed);
    if (!has_failed && error == 0)
        note_success(name, arguments, result);
    if (error == 0)
        return result;
    errno = error;
    return kind.failure;
}

void begin_faults(Fault fault, int nth, Strike *strike) {
    pthread_atfork(nullptr, nullptr, [] { plan = {}; }); // no faults in what it runs
    plan = {fault, nth, strike};
}

void end_faults() {
    if (plan.fault == Fault::power_cut)
        cut_power();
    plan = {};
}

static std::vector<int64_t> waits;
static bool is_next_interrupted;

void interrupt_next_wait() {
    is_next_interrupted = true;
}

std::vector<int64_t> take_waits() {
    return std::exchange(waits, {});
}

extern "C" unsigned int __wrap_sleep(unsigned int seconds) {
    waits.push_back(seconds * second);
    errno = ECANCELED; // whoever reads errno after a sleep reads it too late
    return 0;
}

extern "C" int __wrap_nanosleep(const struct timespec *request, struct timespec *remaining) {
    waits.push_back(request->tv_sec * second + request->tv_nsec);
    if (!std::exchange(is_next_interrupted, false))
        return 0;
    if (remaining)
        *remaining = {0, 1};
    errno = EINTR;
    return -1;
}

} // namespace test
