// What every operation promises when one of its calls fails, when it is killed, and when the power
// goes: each call of the library's in turn is struck, until an undisturbed run comes through.
#include "faults.h"
#include "fixture.h"
#include "operations.h"

#include <csignal>
#include <cstring>
#include <filesystem>
#include <fnmatch.h>
#include <iterator>
#include <optional>
#include <set>
#include <sstream>
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
    bool mask_kept;
    bool signals_kept;
};
Outcome &outcome = *static_cast<Outcome *>(
    mmap(nullptr, sizeof(Outcome), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));

[[noreturn]] void perform_here(const Operation &operation, Fault fault, int nth) {
    sigset_t signals_before = {};
    sigset_t signals_after = {};
    sigprocmask(SIG_BLOCK, nullptr, &signals_before);
    umask(022);
    if (!freopen("/dev/null", "w", stdout))
        abort();
    if (operation.trait == Trait::starts_library)
        vlsys_exit();
    begin_faults(fault, nth, &outcome.strike);
    outcome.result = operation.run(outcome.records);
    end_faults();
    outcome.mask_kept = umask(0) == 022;
    sigprocmask(SIG_BLOCK, nullptr, &signals_after);
    outcome.signals_kept = memcmp(&signals_before, &signals_after, sizeof signals_before) == 0;
    _exit(0);
}

// In a process of its own: what the library keeps starts afresh.
void perform(const Operation &operation, Fault fault, int nth = 0) {
    outcome = {};
    take_raw_log();
    const pid_t process = fork();
    ASSERT_GE(process, 0);
    if (process == 0)
        perform_here(operation, fault, nth);
    int status = 0;
    waitpid(process, &status, 0);
    const bool is_killed = outcome.strike.struck && fault != Fault::failure;
    EXPECT_EQ(status, is_killed ? SIGKILL : 0) << "as waitpid tells it";
}

class Faults : public Unit, public testing::WithParamInterface<Operation> {
  protected:
    void SetUp() override;
    void TearDown() override;
    bool may_pass_over(const char *call) const;
    void strike_every_call(Fault fault);
    void expect_whole_files(const Files &files, Fault fault);
    void expect_documented(const Files &files);
    void expect_repeatable();

    const Operation &operation_ = GetParam();
    std::optional<ScriptedSurrogate> surrogate_;
    Records records_; // of the undisturbed run, as the files
    Files files_;
    std::map<std::string, std::set<std::string>> versions_; // of each file; "gone" when missing
};

std::string text_of(const Files &files, const std::string &path) {
    return files.contains(path) ? files.at(path) : "gone";
}

std::set<std::string> words_of(const char *text) {
    std::istringstream stream(text);
    return {std::istream_iterator<std::string>(stream), {}};
}

void Faults::SetUp() {
    Unit::SetUp();
    prepare_operations();
    surrogate_.emplace("0\n", ScriptedSurrogate::Then::await_start,
                       "MainSerialNumber: 41600123\n0\n");
    run("mkdir /run/versions");
    reset_files();
    std::vector<Files> states = {unit_files()};
    perform(operation_, Fault::copy_etc);
    ASSERT_EQ(outcome.result, operation_.good);
    records_ = outcome.records;
    files_ = unit_files();
    states.push_back(files_);
    for (int i = 1; access(("/run/versions/" + std::to_string(i)).c_str(), F_OK) == 0; i++)
        states.push_back(unit_files("/run/versions/" + std::to_string(i)));
    std::set<std::string> replaced;
    for (const Files &known : {states[0], files_}) {
        for (const auto &[path, text] : known) {
            for (const Files &state : states)
                versions_[path].insert(text_of(state, path));
            if (versions_[path].size() > 1)
                replaced.insert(std::filesystem::path(path).filename());
        }
    }
    EXPECT_EQ(replaced, words_of(operation_.replaces));
}

void Faults::TearDown() {
    surrogate_.reset();
    Unit::TearDown();
}

// What the README tells to look for after a kill.
bool is_temporary(const std::string &path) {
    const char *const patterns[] = {
        "localtime.new", "sysconfig/clock.??????", "sysconfig/network-??????",
        "sysconfig/network-scripts/ifcfg-*-??????", "sysctl.d/velmora-??????"};
    return std::any_of(std::begin(patterns), std::end(patterns), [&](const char *pattern) {
        return fnmatch(pattern, path.c_str(), FNM_PATHNAME) == 0;
    });
}

void Faults::expect_whole_files(const Files &files, Fault fault) {
    for (const auto &[path, versions] : versions_)
        EXPECT_TRUE(versions.contains(text_of(files, path))) << path << ":\n"
                                                             << text_of(files, path);
    int temporaries = 0;
    for (const auto &file : files) {
        if (versions_.contains(file.first))
            continue;
        temporaries++;
        EXPECT_TRUE(fault == Fault::failure ? file.first == "localtime.new"
                                            : is_temporary(file.first))
            << file.first << " is left";
    }
    EXPECT_LE(temporaries, 1);
}

bool is_documented(Failure failure, long result, int error) {
    switch (failure) {
    case Failure::never:
        return false;
    case Failure::errno_value:
        return result == error;
    case Failure::errno_or_enxio:
        return result == error || result == ENXIO;
    case Failure::negative_errno:
        return result == -error;
    case Failure::minus_one:
        return result == -1;
    case Failure::zero:
        return result == 0;
    case Failure::mixed:
        return result == error || result == -error || result == -1;
    }
    return false;
}

bool Faults::may_pass_over(const char *call) const {
    return words_of(operation_.passes_over).contains(call);
}

void Faults::expect_documented(const Files &files) {
    const Strike &strike = outcome.strike;
    EXPECT_EQ(strike.held, 0) << "descriptors, memory or lists that were not given back";
    EXPECT_TRUE(outcome.mask_kept);
    EXPECT_TRUE(outcome.signals_kept);
    const bool has_good_result = outcome.result == operation_.good;
    const bool is_undisturbed = has_good_result && files == files_ &&
                                memcmp(&outcome.records, &records_, sizeof records_) == 0;
    if (is_undisturbed)
        return;
    const bool has_message = !take_log(LOG_WARNING).empty();
    EXPECT_FALSE(strike.must_retry) << "interrupted, or not offered: nobody shall notice";
    EXPECT_TRUE((has_good_result && may_pass_over(strike.call)) ||
                is_documented(operation_.failure, outcome.result, strike.error))
        << "result " << outcome.result << "\n"
        << changes(files_, files);
    EXPECT_NE(has_message, operation_.trait == Trait::logs_nothing);
}

void Faults::expect_repeatable() {
    perform(operation_, Fault::none);
    EXPECT_EQ(outcome.result, operation_.good);
    Files files = unit_files();
    std::erase_if(files, [](const auto &file) {
        return is_temporary(file.first) && file.first != "localtime.new"; // of before
    });
    EXPECT_EQ(changes(files_, files), "");
}

void Faults::strike_every_call(Fault fault) {
    for (int nth = 1;; nth++) {
        reset_files();
        perform(operation_, fault, nth);
        SCOPED_TRACE(std::string(outcome.strike.call) + ": " + strerror(outcome.strike.error) +
                     ", " + std::to_string(nth));
        const Files files = unit_files();
        // With a step passed over, the next one begins with files that no undisturbed run leaves.
        if (fault != Fault::failure || !may_pass_over(outcome.strike.call))
            expect_whole_files(files, fault);
        if (!outcome.strike.struck)
            break;
        if (fault == Fault::failure)
            expect_documented(files);
        expect_repeatable();
    }
}

TEST_P(Faults, CallFails) {
    strike_every_call(Fault::failure);
}

class Interruptions : public Faults {};

TEST_P(Interruptions, ProcessIsKilled) {
    strike_every_call(Fault::kill);
}

TEST_P(Interruptions, PowerIsCut) {
    strike_every_call(Fault::power_cut);
}

std::vector<Operation> changing_operations() {
    std::vector<Operation> changing;
    std::copy_if(operations.begin(), operations.end(), std::back_inserter(changing),
                 [](const Operation &operation) { return *operation.replaces != '\0'; });
    return changing;
}

std::string name_of(const testing::TestParamInfo<Operation> &test) {
    return test.param.name;
}

INSTANTIATE_TEST_SUITE_P(All, Faults, testing::ValuesIn(operations), name_of);
INSTANTIATE_TEST_SUITE_P(All, Interruptions, testing::ValuesIn(changing_operations()), name_of);

} // namespace
