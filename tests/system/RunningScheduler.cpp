#include "tests/system/RunningScheduler.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <stdexcept>
#include <thread>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/supervisor/RunFolder.h"

namespace orva::test {
namespace {

namespace fs = std::filesystem;

int StatusOf(int waited) {
    return WIFEXITED(waited) ? WEXITSTATUS(waited) : 128 + WTERMSIG(waited);
}

}  // namespace

bool WaitFor(const std::function<bool()>& condition) {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return condition();
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    return true;
}

RunningScheduler::RunningScheduler() : errorFile((sandbox.Path() / "errors").string()) {
    const fs::path appliance = sandbox.Path() / "usr/orva";
    fs::create_directories(appliance / "bin");
    fs::create_directories(appliance / "var");
    fs::create_directory_symlink(ORVA_LIB_DIR, appliance / "lib");
    for (const char* program : {"orva-schedd", "orva-run", "orvaschedtool"}) {
        fs::copy_file(fs::path(ORVA_BIN_DIR) / program, appliance / "bin" / program);
    }
    fs::create_directories(appliance / "orvaman/webman/texts/en");
    // For runs of other accounts.
    fs::permissions(sandbox.Path(), fs::perms(0755));
    SetRoot(sandbox.Path().string());
    TaskStore::Configure({std::chrono::seconds(60), {}});
}

RunningScheduler::~RunningScheduler() {
    if (pid > 0) {
        Kill();
    }
    for (const std::int64_t run : RunFolder::All()) {
        static_cast<void>(RunFolder(run).SignalCommand(SIGKILL));
    }
    for (const std::int64_t run : RunFolder::All()) {
        WaitFor([run] { return !RunFolder(run).IsSupervised(); });
    }
    TaskStore::Configure({});
}

std::string RunningScheduler::Program(const std::string& name) const {
    return (sandbox.Path() / "usr/orva/bin" / name).string();
}

void RunningScheduler::ReplaceSupervisor(const std::string& script) {
    const std::string place = Program("orva-run");
    fs::remove(place);
    sandbox.Write("usr/orva/bin/orva-run", "#!/bin/sh\nREAL=" ORVA_BIN_DIR "/orva-run\n" + script);
    fs::permissions(place, fs::perms(0755));
}

void RunningScheduler::RestoreSupervisor() {
    const std::string place = Program("orva-run");
    fs::remove(place);
    fs::copy_file(fs::path(ORVA_BIN_DIR) / "orva-run", place);
}

std::vector<std::string> RunningScheduler::Arguments() const {
    return {Program("orva-schedd"), "--root", sandbox.Path().string(), "--no-view"};
}

void RunningScheduler::Start() {
    Launch();
    WaitUntilReady();
}

void RunningScheduler::Launch() {
    std::vector<std::string> texts = Arguments();
    std::vector<char*> arguments;
    for (std::string& text : texts) {
        arguments.push_back(text.data());
    }
    arguments.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, (sandbox.Path() / "ready").c_str(),
                                       O_WRONLY | O_CREAT | O_TRUNC, 0644);
    ::posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, errorFile.c_str(),
                                       O_WRONLY | O_CREAT | O_APPEND, 0644);
    const int error =
        ::posix_spawn(&pid, arguments[0], &actions, nullptr, arguments.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    if (error != 0) {
        throw std::runtime_error("the scheduler cannot be run");
    }
}

void RunningScheduler::WaitUntilReady() {
    const bool ready = WaitFor(
        [this] { return ReadWholeFile(sandbox.Path() / "ready").find('\n') != std::string::npos; });
    if (!ready) {
        throw std::runtime_error("the scheduler does not start: " + ErrorText());
    }
}

void RunningScheduler::Kill() {
    Signal(SIGKILL);
    WaitForEnd();
}

int RunningScheduler::Stop() {
    Signal(SIGTERM);
    return WaitForEnd();
}

int RunningScheduler::WaitForEnd() {
    int waited = 0;
    ::waitpid(pid, &waited, 0);
    pid = -1;
    return StatusOf(waited);
}

void RunningScheduler::Signal(int signalNumber) const { ::kill(pid, signalNumber); }

std::string RunningScheduler::ErrorText() const { return ReadWholeFile(errorFile); }

int RunningScheduler::AddTask(const std::string& command) {
    TaskData task;
    task.name = "task";
    task.owner = OwnAccount();
    task.app = "ORVA.ZUM.TaskScheduler.Script";
    task.command = command;
    task.Set(kCanRunAppSameTime, true);
    task.Set(kCanRunTaskSameTime, true);
    task.schedule.mode = Schedule::Mode::kDate;
    task.schedule.date = absl::CivilDay(2099, 1, 1);
    return TaskStore::Current()->Save(task);
}

void RunningScheduler::MakeDueNow(int task) { MakeDue(task, absl::Now()); }

void RunningScheduler::MakeDue(int task, absl::Time time) {
    Execute("UPDATE task SET next_start = " + std::to_string(absl::ToUnixSeconds(time)) +
            " WHERE id = " + std::to_string(task));
}

void RunningScheduler::Wake() const { SchedulerLink::Wake(); }

void RunningScheduler::WaitUntilIdle() {
    const std::string due =
        "SELECT (SELECT count(*) FROM run WHERE state IN ('queued', 'running')) + "
        "(SELECT count(*) FROM task WHERE next_start <= ";
    EXPECT_TRUE(WaitFor([&] {
        SQLite::Database database(ResolvePath(TaskStore::kDatabaseFile), SQLite::OPEN_READONLY,
                                  60'000);
        return database.execAndGet(due + std::to_string(absl::ToUnixSeconds(absl::Now())) + ")")
                   .getInt() == 0;
    })) << ErrorText();
}

std::vector<Run> RunningScheduler::Runs() const {
    return RunStore::Current()->List({}, 0, 1'000'000).runs;
}

Run RunningScheduler::OnlyRunOf(int task) const {
    const RunStore::Page page = RunStore::Current()->List({task, {}}, 0, 10);
    EXPECT_EQ(page.total, 1) << "of task " << task;
    return page.runs.empty() ? Run() : page.runs.front();
}

bool RunningScheduler::WaitForState(std::int64_t run, RunState state) const {
    return WaitFor([run, state] {
        const std::optional<Run> found = RunStore::Current()->Find(run);
        return found && found->state == state;
    });
}

void RunningScheduler::Execute(const std::string& sql) const {
    SQLite::Database database(ResolvePath(TaskStore::kDatabaseFile), SQLite::OPEN_READWRITE,
                              60'000);
    database.exec(sql);
}

std::string RunningScheduler::IntegrityCheck() const {
    SQLite::Database database(ResolvePath(TaskStore::kDatabaseFile), SQLite::OPEN_READWRITE,
                              60'000);
    return database.execAndGet("PRAGMA integrity_check").getString();
}

}  // namespace orva::test
