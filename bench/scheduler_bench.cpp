// The scheduler's speed table, with the real programs: how long after its second a task starts, how
// long a thousand tasks of one second take, how much memory the scheduler needs for 10,000 tasks.
// The appliance is made in a folder below ORVA_BENCH_DIR.
#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <absl/time/time.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/runs/RunStore.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/TaskStore.h"

namespace {

namespace fs = std::filesystem;

constexpr int kTasks = 10'000;
constexpr int kSingleStarts = 40;
constexpr int kStartsAtOnce = 1000;

// Runs for as long as this lives.
class SchedulerProcess {
  public:
    SchedulerProcess() {
        std::string program = ORVA_BIN_DIR "/orva-schedd";
        std::string root = orva::Root();
        char* arguments[] = {program.data(), const_cast<char*>("--no-view"),
                             const_cast<char*>("--root"), root.data(), nullptr};
        if (::posix_spawn(&pid, program.c_str(), nullptr, nullptr, arguments, environ) != 0) {
            std::perror(program.c_str());
            std::exit(EXIT_FAILURE);
        }
        // Answered once it is at work.
        while (orva::SchedulerLink::Stop(1'000'000) != "no such run") {
            absl::SleepFor(absl::Milliseconds(10));
        }
    }
    ~SchedulerProcess() {
        ::kill(pid, SIGTERM);
        ::waitpid(pid, nullptr, 0);
    }
    SchedulerProcess(const SchedulerProcess&) = delete;
    SchedulerProcess& operator=(const SchedulerProcess&) = delete;

    long PeakKiB() const {
        std::ifstream status("/proc/" + std::to_string(pid) + "/status");
        for (std::string line; std::getline(status, line);) {
            if (line.rfind("VmHWM:", 0) == 0) {
                return std::strtol(line.c_str() + 6, nullptr, 10);
            }
        }
        return 0;
    }

  private:
    pid_t pid = -1;
};

void StoreTasks() {
    std::vector<orva::TaskData> tasks(kTasks);
    for (int count = 0; count < kTasks; ++count) {
        orva::TaskData& task = tasks[static_cast<std::size_t>(count)];
        task.name = "Task " + std::to_string(count);
        task.owner = orva::OwnAccount();
        task.app = "ORVA.ZUM.TaskScheduler.Script";
        task.command = "true";
        task.Set(orva::kCanRunAppSameTime, true);
        // In the far future, each at a minute of its own.
        task.schedule.mode = orva::Schedule::Mode::kDate;
        task.schedule.date = absl::CivilDay(2099, 1, 1) + count / 1440;
        task.schedule.firstMinute = count % 1440;
    }
    orva::TaskStore::Current()->SaveAll(tasks);
}

void MakeDue(int first, int count, absl::Time second) {
    SQLite::Database database(orva::ResolvePath(orva::TaskStore::kDatabaseFile),
                              SQLite::OPEN_READWRITE, 10'000);
    database.exec("UPDATE task SET next_start = " + std::to_string(absl::ToUnixSeconds(second)) +
                  " WHERE id BETWEEN " + std::to_string(first) + " AND " +
                  std::to_string(first + count - 1));
    orva::SchedulerLink::Wake();
}

// Waits until so many runs have ended; yields how long after their second the newest `count` were
// started, in milliseconds, ascending.
std::vector<double> Delays(std::int64_t ended, int count) {
    while (orva::RunStore::Current()->List({{}, orva::RunState::kEnded}, 0, 0).total < ended) {
        absl::SleepFor(absl::Milliseconds(20));
    }
    std::vector<double> delays;
    for (const orva::Run& run : orva::RunStore::Current()->List({}, 0, count).runs) {
        delays.push_back(absl::ToDoubleMilliseconds(*run.startedAt - *run.occurrence));
    }
    std::sort(delays.begin(), delays.end());
    return delays;
}

void MeasureSingleStarts() {
    absl::Time second = absl::FromUnixSeconds(absl::ToUnixSeconds(absl::Now())) + absl::Seconds(2);
    for (int count = 0; count < kSingleStarts; ++count) {
        MakeDue(1 + count, 1, second);
        second += absl::Seconds(1);
        absl::SleepFor(second - absl::Milliseconds(500) - absl::Now());
    }
    const std::vector<double> delays = Delays(kSingleStarts, kSingleStarts);
    std::printf("start after the due second, %d starts:  p50 %.0f ms, p99 %.0f ms\n", kSingleStarts,
                delays[delays.size() / 2], delays[delays.size() * 99 / 100]);
}

void MeasureStartsAtOnce() {
    const absl::Time second =
        absl::FromUnixSeconds(absl::ToUnixSeconds(absl::Now())) + absl::Seconds(2);
    MakeDue(1 + kSingleStarts, kStartsAtOnce, second);
    const std::vector<double> delays = Delays(kSingleStarts + kStartsAtOnce, kStartsAtOnce);
    std::printf(
        "%d due in one second: the first started after %.0f ms, half after %.0f ms, the "
        "last after %.0f ms\n",
        kStartsAtOnce, delays.front(), delays[delays.size() / 2], delays.back());
}

}  // namespace

int main() {
    const char* const place = std::getenv("ORVA_BENCH_DIR");
    const fs::path root =
        fs::path(place != nullptr ? place : ".") / ("sched-" + std::to_string(::getpid()));
    fs::create_directories(root / "usr/orva/etc");
    std::ofstream(root / "usr/orva/etc/orva.conf") << "schedmaxruns=\"" << kStartsAtOnce << "\"\n";
    orva::SetRoot(root.string());
    StoreTasks();
    {
        const SchedulerProcess scheduler;
        const long atRest = scheduler.PeakKiB();
        MeasureSingleStarts();
        MeasureStartsAtOnce();
        std::printf("peak memory with %d tasks: %ld KiB after the start, %ld KiB after all that\n",
                    kTasks, atRest, scheduler.PeakKiB());
    }
    std::error_code ignored;
    fs::remove_all(root, ignored);
    return EXIT_SUCCESS;
}
