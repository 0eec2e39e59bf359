// What every operation promises when one of its calls fails, when its process is killed, and when
// the power is cut. Each test strikes the calls in turn, until a run has no further call to strike.
#include "faults.h"
#include "fixture.h"
#include "operations.h"

#include <algorithm>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fnmatch.h>
#include <string_view>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace test;

namespace {

// Shared with the process that runs the operation.
struct Outcome {
    Strike strike;
    long result;
    Records records;
    mode_t umask;
    sigset_t blocked_signals;
};
Outcome &outcome = *static_cast<Outcome *>(
    mmap(nullptr, sizeof(Outcome), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));

[[noreturn]] void perform_here(const Operation &operation, Fault fault, int nth) {
    vlsys_exit();
    umask(022);
    if (!freopen("/dev/null", "w", stdout))
        abort();
    begin_faults(fault, nth, &outcome.strike);
    outcome.result = operation.run(outcome.records);
    vlsys_exit();
    end_faults();
    outcome.umask = umask(0);
    sigprocmask(SIG_BLOCK, nullptr, &outcome.blocked_signals);
    _exit(0);
}

// In a process of its own: what the library keeps starts afresh.
void perform(const Operation &operation, Fault fault, int nth = 0) {
    outcome = {.records = given};
    take_log();
    const pid_t process = fork();
    if (process == 0)
        perform_here(operation, fault, nth);
    int status = 0;
    waitpid(process, &status, 0);
    const bool should_be_killed = *outcome.strike.call != '\0' && fault != Fault::failure;
    EXPECT_EQ(status, should_be_killed ? SIGKILL : 0) << "the wait status";
}

std::string text_of(const Files &files, const std::string &path) {
    return files.contains(path) ? files.at(path) : "gone";
}

bool is_temporary(const std::string &path) {
    const auto patterns = {"localtime.new", "sysconfig/clock.??????", "sysconfig/network-??????",
                           "sysconfig/network-scripts/ifcfg-*-??????", "sysctl.d/velmora-??????"};
    return std::any_of(patterns.begin(), patterns.end(), [&](const char *pattern) {
        return fnmatch(pattern, path.c_str(), FNM_PATHNAME) == 0;
    });
}

bool may_be_left(const std::string &path, Fault fault) {
    return fault == Fault::failure ? path == "localtime.new" : is_temporary(path);
}

// Messages name the call, another that the log has always named in its place, or what it was for.
bool is_named(const std::string &log, const std::string &call) {
    const auto names = {call.c_str(),   "printf(",
                        "mkstemp(",     "getline(",
                        "fgets(",       "fputs(",
                        "edit(",        "param: failed",
                        " /etc/",       " /proc/",
                        " IPv",         " DNS",
                        "get_hostname", "fallback to direct call"};
    return std::any_of(names.begin(), names.end(),
                       [&](const char *name) { return log.find(name) != std::string::npos; });
}

std::string_view bytes_of(const Records &records) {
    return {reinterpret_cast<const char *>(&records), sizeof records};
}

class Faults : public Unit, public testing::WithParamInterface<Operation> {
  protected:
    void SetUp() override;
    void strike_every_call(Fault fault);
    void expect_whole_files(const Files &files, Fault fault);
    void expect_documented(const Files &files);
    void expect_repeatable();

    const Operation &operation_ = GetParam();
    std::vector<Files> states_; // of an undisturbed run: before, after each rename, at the end
    Outcome undisturbed_;
};

void Faults::SetUp() {
    Unit::SetUp();
    prepare_operations();
    run("surrogate-parent && mkdir /run/versions");
    reset_files();
    states_ = {unit_files()};
    perform(operation_, Fault::copy_etc);
    undisturbed_ = outcome;
    ASSERT_EQ(outcome.result, operation_.good);
    for (const auto &version : std::filesystem::directory_iterator("/run/versions"))
        states_.push_back(unit_files(version.path()));
    states_.push_back(unit_files());
}

void Faults::expect_whole_files(const Files &files, Fault fault) {
    Files all = files;
    all.insert(states_.front().begin(), states_.front().end());
    for (const auto &file : all) {
        const std::string &path = file.first;
        const std::string text = text_of(files, path);
        const bool is_whole = std::any_of(states_.begin(), states_.end(), [&](const Files &state) {
            return text_of(state, path) == text;
        });
        EXPECT_TRUE(is_whole || may_be_left(path, fault)) << path << ":\n" << text;
    }
}

void Faults::expect_documented(const Files &files) {
    const Strike &strike = outcome.strike;
    EXPECT_EQ(strike.held, 0) << "descriptors, memory or lists that were not released";
    EXPECT_EQ(outcome.umask, 022U);
    EXPECT_EQ(memcmp(&outcome.blocked_signals, &undisturbed_.blocked_signals, sizeof(sigset_t)), 0);
    const bool has_good_result = outcome.result == operation_.good;
    const bool has_records = bytes_of(outcome.records) == bytes_of(undisturbed_.records);
    if (has_good_result && has_records && files == states_.back())
        return; // made good
    EXPECT_FALSE(strike.must_go_unnoticed);
    const std::string failure = operation_.failure;
    EXPECT_TRUE((has_good_result && has_word(operation_.passes_over, strike.call)) ||
                (has_word(failure, "errno") && outcome.result == strike.error) ||
                (has_word(failure, "-errno") && outcome.result == -strike.error) ||
                (has_word(failure, "ENXIO") && outcome.result == ENXIO) ||
                has_word(failure, std::to_string(outcome.result)))
        << "result " << outcome.result << ", files " << changes(states_.back(), files);
    const std::string log = take_log(LOG_WARNING);
    EXPECT_EQ(log.empty(), has_word(failure, "silent"));
    EXPECT_TRUE(log.empty() || is_named(log, strike.call)) << log;
}

void Faults::expect_repeatable() {
    perform(operation_, Fault::none);
    EXPECT_EQ(outcome.result, operation_.good);
    Files files = unit_files();
    std::erase_if(files, [](const auto &file) { return is_temporary(file.first); });
    EXPECT_EQ(changes(states_.back(), files), "");
}

void Faults::strike_every_call(Fault fault) {
    if (fault != Fault::failure && states_.back() == states_.front())
        return; // it writes nothing
    for (int nth = 1;; nth++) {
        reset_files();
        perform(operation_, fault, nth);
        const std::string call = outcome.strike.call;
        SCOPED_TRACE(call + ": " + strerror(outcome.strike.error) + ", " + std::to_string(nth));
        const Files files = unit_files();
        // A step that was passed over leaves files that no undisturbed run has.
        if (fault != Fault::failure || !has_word(operation_.passes_over, call))
            expect_whole_files(files, fault);
        if (call.empty())
            break;
        if (fault == Fault::failure)
            expect_documented(files);
        expect_repeatable();
    }
}

TEST_P(Faults, AFailedCallIsReportedOrMadeGood) {
    strike_every_call(Fault::failure);
}

TEST_P(Faults, AKillLeavesWholeFiles) {
    strike_every_call(Fault::kill);
}

TEST_P(Faults, APowerCutLeavesWholeFiles) {
    strike_every_call(Fault::power_cut);
}

INSTANTIATE_TEST_SUITE_P(All, Faults, testing::ValuesIn(operations),
                         [](const auto &test) { return std::string(test.param.name); });

} // namespace
