#include "faults.h"

#include "fixture.h"

#include <bit>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <netdb.h>
#include <pthread.h>
#include <sstream>
#include <sys/stat.h>
#include <tuple>
#include <unistd.h>

namespace test {

enum class Holds { nothing, gives, takes };
static constexpr Holds nothing = Holds::nothing;
static constexpr Holds gives = Holds::gives; // what another one takes back
static constexpr Holds takes = Holds::takes; // whether it fails or not

struct Calls {
    std::string names;
    Word failure; // their result when they fail
    Holds holds;
    std::vector<int> errors;    // that can come of them
    std::vector<int> unnoticed; // that the operation must make good
};

// Every call of the library's that can fail, and those that give back. CMakeLists.txt reads the
// names off the beginnings of these lines.
static const Calls calls[] = {
    {"open mkostemp", -1, gives, {EMFILE, EACCES}, {}},
    {"socket getifaddrs", -1, gives, {EMFILE}, {}},
    {"vasprintf", -1, gives, {ENOMEM}, {}},
    {"getaddrinfo", EAI_SYSTEM, gives, {ENOMEM}, {}},
    {"fopen popen if_nameindex", 0, gives, {EMFILE, ENOMEM}, {}},
    {"malloc calloc realloc strdup strndup fts_open realpath", 0, gives, {ENOMEM}, {}},
    {"close", -1, takes, {EIO}, {EINTR}},
    {"fclose fts_close pclose", -1, takes, {EIO}, {}},
    {"free freeaddrinfo freeifaddrs if_freenameindex", 0, takes, {}, {}},
    {"read recv", -1, nothing, {EIO}, {EINTR}},
    {"write", -1, nothing, {EIO, ENOSPC}, {EINTR}},
    {"send", -1, nothing, {EPIPE}, {EINTR}},
    {"connect", -1, nothing, {ECONNREFUSED, ETIMEDOUT}, {EINTR}},
    {"fsync", -1, nothing, {EIO, ENOSPC}, {EINVAL}},
    {"getxattr", -1, nothing, {EIO}, {ENODATA, EOPNOTSUPP}},
    {"fsetxattr fchmod chmod sethostname", -1, nothing, {EPERM}, {}},
    {"rename unlink fstat", -1, nothing, {EIO, EACCES}, {}},
    {"access", -1, nothing, {}, {ENOENT, EACCES}},
    {"symlink", -1, nothing, {ENOSPC, EEXIST}, {}},
    {"mkdir rmdir", -1, nothing, {ENOSPC, EROFS}, {}},
    {"setenv gethostname", -1, nothing, {ENOMEM}, {}},
    {"fork system", -1, nothing, {EAGAIN}, {}},
    {"fdopen fts_read getcwd localtime_r", 0, nothing, {ENOMEM}, {}},
    {"if_nametoindex if_indextoname", 0, nothing, {EMFILE}, {}},
    {"getnameinfo", EAI_SYSTEM, nothing, {ENOMEM}, {}},
};

// A file that was opened and then cannot be read, which shows in the first read from the stream.
static const Calls reading = {"reading", 0, nothing, {EIO}, {}};

static thread_local struct {
    Fault fault = Fault::none;
    int left = 0; // calls to come, the struck one included
    Strike *strike = nullptr;
} plan;

// What fail_call asks for.
static thread_local struct {
    std::string name;
    int left = 0;
    int error = 0;
} wish;

void fail_call(const std::string &name, int nth, int error) {
    wish = {name, nth, error};
}

static int wished_error(const std::string &name) {
    return name == wish.name && --wish.left == 0 ? wish.error : 0;
}

// ---- Power

static std::map<ino_t, off_t> flushed; // so much of a file is on the disk
static std::vector<std::string> replaced;

static void note_flush(int descriptor) {
    struct stat status = {};
    fstat(descriptor, &status);
    flushed[status.st_ino] = status.st_size;
}

// A flush or a close that fails tells of writes that never reach the disk.
static void lose(int descriptor) {
    [[maybe_unused]] const int result = ftruncate(descriptor, 0);
}

static void cut_power() {
    for (const auto &path : replaced) {
        struct stat status = {};
        if (lstat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
            truncate(path.c_str(), flushed[status.st_ino]) != 0)
            abort();
    }
}

// ---- Strikes

static void strike_at(const std::string &name) {
    snprintf(plan.strike->call, sizeof plan.strike->call, "%s", name.c_str());
}

static void maybe_end(const std::string &name) {
    if ((plan.fault != Fault::kill && plan.fault != Fault::power_cut) || --plan.left > 0)
        return;
    strike_at(name);
    if (plan.fault == Fault::power_cut)
        cut_power();
    raise(SIGKILL);
}

// The errno that this call fails with; 0 when it does not.
static int choose_error(const std::string &name, const Calls &kind) {
    if (plan.fault != Fault::failure || plan.left <= 0)
        return 0;
    std::vector<int> ways = kind.errors;
    ways.insert(ways.end(), kind.unnoticed.begin(), kind.unnoticed.end());
    const auto way = static_cast<size_t>(plan.left - 1);
    plan.left -= static_cast<int>(ways.size());
    if (way >= ways.size())
        return 0;
    strike_at(name);
    plan.strike->must_retry = way >= kind.errors.size();
    plan.strike->error = ways[way];
    return ways[way];
}

// From here on its reads fail as those of a bad disk do.
static void make_unreadable(FILE *file) {
    const int unreadable = open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
    dup3(unreadable, fileno(file), O_CLOEXEC);
    close(unreadable);
}

// What there is to note of a call that has gone well.
static void note(const std::string &name, const std::array<Word, 7> &arguments, Word result) {
    if (name == "fsync")
        note_flush(static_cast<int>(arguments[0]));
    if (name == "rename")
        replaced.emplace_back(std::bit_cast<const char *>(arguments[1]));
    if (name == "rename" && plan.fault == Fault::copy_etc)
        run("cp -a /etc /run/versions/$(ls /run/versions | wc -l)");
    if (name == "fopen" && choose_error("reading", reading) != 0)
        make_unreadable(std::bit_cast<FILE *>(result));
}

static int change_of_held(const std::string &name, Holds holds, Word first, bool has_failed) {
    if (holds == Holds::takes)
        return name == "free" && first == 0 ? 0 : -1;
    const bool had_it = name == "realloc" && first != 0;
    return holds == Holds::gives && !has_failed && !had_it ? 1 : 0;
}

static Word fail(const Calls &kind, int error) {
    errno = error;
    return kind.failure;
}

static const Calls &find_kind(const char *name) {
    static std::map<std::string, const Calls *> kinds;
    if (kinds.empty()) {
        for (const Calls &kind : calls) {
            std::istringstream names(kind.names);
            for (std::string word; names >> word;)
                kinds[word] = &kind;
        }
    }
    return *kinds.at(name);
}

// Called in place of `real`; see tests/CMakeLists.txt.
Word intercept(const char *name, Function *real, const std::array<Word, 7> &arguments) {
    if (!plan.strike && wish.left <= 0)
        return std::apply(real, arguments);
    const Calls &kind = find_kind(name);
    if (const int error = wished_error(name))
        return fail(kind, error);
    if (!plan.strike)
        return std::apply(real, arguments);
    maybe_end(name);
    const int error = choose_error(name, kind);
    if (error != 0 && !plan.strike->must_retry && (kind.names == "close" || kind.names == "fsync"))
        lose(static_cast<int>(arguments[0]));
    if (error != 0 && kind.holds != Holds::takes)
        return fail(kind, error);
    const Word result = std::apply(real, arguments);
    if (!plan.strike)
        return result; // the call was fork, and this is the child
    const bool has_failed = kind.failure == 0 ? result == 0 : static_cast<int>(result) < 0;
    plan.strike->held += change_of_held(name, kind.holds, arguments[0], has_failed);
    if (error != 0)
        return fail(kind, error);
    if (!has_failed)
        note(name, arguments, result);
    return result;
}

void begin_faults(Fault fault, int nth, Strike *strike) {
    pthread_atfork(nullptr, nullptr, [] { plan = {}; }); // commands are no business of ours
    *strike = {};
    plan = {fault, nth, strike};
}

void end_faults() {
    if (plan.fault == Fault::power_cut)
        cut_power();
    plan = {};
}

// ---- Waits

static std::vector<int64_t> waits;

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
    const int error = wished_error("nanosleep");
    if (error == 0)
        return 0;
    if (remaining)
        *remaining = {0, 1};
    errno = error;
    return -1;
}

} // namespace test
