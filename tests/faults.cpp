#include "faults.h"

#include "fixture.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <netdb.h>
#include <pthread.h>
#include <string_view>
#include <sys/stat.h>
#include <tuple>
#include <unistd.h>

namespace test {

enum class Holds { nothing, gives, takes };

struct Call {
    const char *name;
    Word failure;               // its result when it fails
    Holds holds;                // gives what another one takes back; taking is done, failed or not
    std::vector<int> errors;    // that can come of it
    std::vector<int> unnoticed; // that the operation must make good
};

// Every call of the library's that can fail, and those that give back. tests/CMakeLists.txt reads
// the names off the beginnings of these lines.
static constexpr Holds nothing = Holds::nothing;
static constexpr Holds gives = Holds::gives;
static constexpr Holds takes = Holds::takes;
static const Call calls[] = {
    {"open", -1, gives, {EMFILE, EACCES}, {}},
    {"mkostemp", -1, gives, {EMFILE, ENOSPC}, {}},
    {"read", -1, nothing, {EIO}, {EINTR}},
    {"write", -1, nothing, {EIO, ENOSPC}, {EINTR}},
    {"fsync", -1, nothing, {EIO, ENOSPC}, {EINVAL}},
    {"fstat", -1, nothing, {EIO}, {}},
    {"fchmod", -1, nothing, {EPERM}, {}},
    {"getxattr", -1, nothing, {EIO}, {ENODATA, EOPNOTSUPP}},
    {"fsetxattr", -1, nothing, {EPERM}, {}},
    {"close", -1, takes, {EIO}, {}},
    {"fopen", 0, gives, {EMFILE, EACCES}, {}},
    {"fdopen", 0, nothing, {ENOMEM}, {}},
    {"fclose", -1, takes, {EIO}, {}},
    {"popen", 0, gives, {EMFILE, ENOMEM}, {}},
    {"pclose", -1, takes, {ECHILD}, {}},
    {"chmod", -1, nothing, {EPERM}, {}},
    {"rename", -1, nothing, {EIO, EACCES}, {}},
    {"symlink", -1, nothing, {ENOSPC, EEXIST}, {}},
    {"unlink", -1, nothing, {EACCES}, {}},
    {"mkdir", -1, nothing, {ENOSPC, EROFS}, {}},
    {"rmdir", -1, nothing, {EBUSY}, {}},
    {"realpath", 0, gives, {ENOMEM, EACCES}, {}},
    {"getcwd", 0, nothing, {ENOENT, ERANGE}, {}},
    {"fts_open", 0, gives, {ENOMEM}, {}},
    {"fts_read", 0, nothing, {ENOMEM}, {}},
    {"fts_close", -1, takes, {EIO}, {}},
    {"malloc", 0, gives, {ENOMEM}, {}},
    {"calloc", 0, gives, {ENOMEM}, {}},
    {"realloc", 0, gives, {ENOMEM}, {}},
    {"strdup", 0, gives, {ENOMEM}, {}},
    {"strndup", 0, gives, {ENOMEM}, {}},
    {"vasprintf", -1, gives, {ENOMEM}, {}},
    {"free", 0, takes, {}, {}},
    {"setenv", -1, nothing, {ENOMEM}, {}},
    {"socket", -1, gives, {EMFILE}, {}},
    {"connect", -1, nothing, {ECONNREFUSED, ETIMEDOUT}, {EINTR}},
    {"send", -1, nothing, {EPIPE}, {EINTR}},
    {"recv", -1, nothing, {ECONNRESET}, {EINTR}},
    {"getaddrinfo", EAI_SYSTEM, gives, {ENOMEM}, {}},
    {"freeaddrinfo", 0, takes, {}, {}},
    {"getnameinfo", EAI_SYSTEM, nothing, {ENOMEM}, {}},
    {"getifaddrs", -1, gives, {EMFILE}, {}},
    {"freeifaddrs", 0, takes, {}, {}},
    {"if_nameindex", 0, gives, {EMFILE}, {}},
    {"if_freenameindex", 0, takes, {}, {}},
    {"if_nametoindex", 0, nothing, {EMFILE}, {}},
    {"if_indextoname", 0, nothing, {EMFILE}, {}},
    {"gethostname", -1, nothing, {ENAMETOOLONG}, {}},
    {"sethostname", -1, nothing, {EPERM}, {}},
    {"localtime_r", 0, nothing, {EOVERFLOW}, {}},
    {"fork", -1, nothing, {EAGAIN}, {}},
    {"system", -1, nothing, {EAGAIN}, {}},
    {"sigaction", -1, nothing, {EINVAL}, {}},
    {"sigprocmask", -1, nothing, {EINVAL}, {}},
};

// A file that was opened and then cannot be read, which shows in the first read from the stream.
static const Call reading = {"reading", 0, nothing, {EIO}, {}};

static const Call nanosleep_call = {"nanosleep", -1, nothing, {}, {}};

struct Plan {
    Fault fault = Fault::none;
    int left = 0; // calls to come, the struck one included
    Strike *strike = nullptr;
    // The calls of this name alone count; the last one fails with this errno, or acts first.
    std::string name;
    int error = 0;
    void (*act)() = nullptr;
};
static thread_local Plan plan;
static Strike not_asked_for;

void fail_call(const std::string &name, int nth, int error) {
    plan = {Fault::failure, nth, &not_asked_for, name, error, nullptr};
}

void before_call(const std::string &name, void (*act)()) {
    plan = {Fault::failure, 1, &not_asked_for, name, 0, act};
}

// ---- Power

struct NewFile {
    int descriptor; // the library's
    int handle;     // our own, as good when that is closed and the file has another name
    off_t flushed;  // so many bytes are on the disk
};
static std::vector<NewFile> new_files;

static void note_flush(int descriptor) {
    struct stat status = {};
    fstat(descriptor, &status);
    for (auto &file : new_files)
        if (file.descriptor == descriptor)
            file.flushed = status.st_size;
}

static void lose_what_is_not_flushed(const NewFile &file) {
    if (ftruncate(file.handle, file.flushed) != 0 && errno != EINVAL) // not open for writing
        abort();
}

static void cut_power() {
    std::for_each(new_files.begin(), new_files.end(), lose_what_is_not_flushed);
}

// A flush or a close that fails tells of writes that never reach the disk.
static void note_loss(int descriptor) {
    for (const auto &file : new_files)
        if (file.descriptor == descriptor)
            lose_what_is_not_flushed(file);
}

static void note_close(int descriptor) {
    for (auto &file : new_files)
        if (file.descriptor == descriptor)
            file.descriptor = -1;
}

// ---- Strikes

static void strike_at(const Call &call) {
    plan.strike->struck = true;
    snprintf(plan.strike->call, sizeof plan.strike->call, "%s", call.name);
}

static int fail_or_act() {
    if (plan.act)
        plan.act();
    return plan.error;
}

// The errno that this call fails with; 0 when it does not.
static int choose_error(const Call &call) {
    if (plan.fault != Fault::failure || plan.left <= 0)
        return 0;
    if (!plan.name.empty())
        return plan.name == call.name && --plan.left == 0 ? fail_or_act() : 0;
    const auto way = static_cast<size_t>(plan.left - 1);
    plan.left -= static_cast<int>(call.errors.size() + call.unnoticed.size());
    if (plan.left > 0)
        return 0;
    strike_at(call);
    plan.strike->must_retry = way >= call.errors.size();
    plan.strike->error =
        plan.strike->must_retry ? call.unnoticed[way - call.errors.size()] : call.errors[way];
    return plan.strike->error;
}

static void maybe_end(const Call &call) {
    if ((plan.fault != Fault::kill && plan.fault != Fault::power_cut) || --plan.left > 0)
        return;
    strike_at(call);
    if (plan.fault == Fault::power_cut)
        cut_power();
    raise(SIGKILL);
}

static bool has_failed(const Call &call, Word result) {
    return call.failure == 0 ? result == 0 : static_cast<int>(result) < 0;
}

static bool is(const Call &call, const char *name) {
    return strcmp(call.name, name) == 0;
}

// From here on its reads fail as those of a bad disk do.
static void make_unreadable(FILE *file) {
    const int unreadable = open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
    dup3(unreadable, fileno(file), O_CLOEXEC);
    close(unreadable);
}

static void keep_version() {
    static int count;
    std::filesystem::copy("/etc", "/run/versions/" + std::to_string(++count),
                          std::filesystem::copy_options::recursive |
                              std::filesystem::copy_options::copy_symlinks);
}

// What there is to note of a call that has gone well. `first` is its first argument.
static void note(const Call &call, Word first, Word result) {
    const bool has_more_room = is(call, "realloc") && first != 0;
    plan.strike->held += call.holds == Holds::gives && !has_more_room;
    if (is(call, "mkostemp") || is(call, "open"))
        new_files.push_back({static_cast<int>(result), dup(static_cast<int>(result)), 0});
    if (is(call, "fsync"))
        note_flush(static_cast<int>(first));
    if (is(call, "rename") && plan.fault == Fault::copy_etc)
        keep_version();
    if (is(call, "fopen") && choose_error(reading) != 0)
        make_unreadable(reinterpret_cast<FILE *>(result));
}

static const Call &find_call(const char *name) {
    const Call *call = calls;
    while (!is(*call, name))
        ++call;
    return *call;
}

// Called in place of `real`; see tests/CMakeLists.txt.
Word intercept(const char *name, Function *real, const std::array<Word, 7> &arguments) {
    if (!plan.strike)
        return std::apply(real, arguments);
    const Call &call = find_call(name);
    maybe_end(call);
    const Word first = arguments[0];
    const bool puts_back = std::string_view(name).starts_with("sig") && arguments[2] == 0;
    const int error = puts_back ? 0 : choose_error(call); // an old setting is always taken
    Word result = call.failure;
    if (error == 0 || call.holds == Holds::takes)
        result = std::apply(real, arguments);
    if (!plan.strike)
        return result; // the call was fork, and this is the child
    if (call.holds == Holds::takes)
        plan.strike->held -= !is(call, "free") || first != 0;
    if ((is(call, "close") || is(call, "fsync")) && error != 0 && !plan.strike->must_retry)
        note_loss(static_cast<int>(first));
    if (is(call, "close"))
        note_close(static_cast<int>(first));
    if (error < 0)
        return error; // of the resolver
    if (error != 0) {
        errno = error;
        return call.failure;
    }
    if (!has_failed(call, result))
        note(call, first, result);
    return result;
}

void begin_faults(Fault fault, int nth, Strike *strike) {
    pthread_atfork(nullptr, nullptr, [] { plan = {}; }); // commands are no business of ours
    *strike = {};
    plan = {fault, nth, strike, "", 0, nullptr};
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
    const int error = choose_error(nanosleep_call);
    if (error == 0)
        return 0;
    if (error == EINTR && remaining)
        *remaining = {0, 1}; // of the time
    errno = error;
    return -1;
}

} // namespace test
