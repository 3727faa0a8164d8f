#include "tests/appliance/store/StoreTest.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <fstream>
#include <stdexcept>

namespace {

std::string EnterOwnMounts() {
    const uid_t user = ::getuid();
    const gid_t group = ::getgid();
    if (user != 0) {
        if (::unshare(CLONE_NEWUSER) != 0) {
            return std::string("unshare user: ") + std::strerror(errno);
        }
        // Both ids: a file system that is mounted here takes no file of an unmapped one.
        std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
        std::ofstream("/proc/self/setgroups") << "deny";
        std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
    }
    if (::unshare(CLONE_NEWNS) != 0) {
        return std::string("unshare mounts: ") + std::strerror(errno);
    }
    if (::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
        return std::string("mount private: ") + std::strerror(errno);
    }
    return {};
}

}  // namespace

StoreTest::StoreTest() : nowSecond(std::make_shared<std::atomic<std::int64_t>>(0)) {
    ::setenv("TZ", "UTC", 1);
    SetNow("2026-05-01 12:00:00");
    Reopen();
}

StoreTest::~StoreTest() { orva::TaskStore::Configure({}); }

std::string StoreTest::DatabasePath() const { return RootPath() + "/usr/orva/var/tasks.db"; }

orva::TaskStore::Options StoreTest::Options(std::chrono::milliseconds busyTimeout) {
    return {busyTimeout, [now = nowSecond] { return absl::FromUnixSeconds(*now); }};
}

std::string StoreTest::Stored(const std::string& sql) const {
    SQLite::Database database(DatabasePath());
    return database.execAndGet(sql).getString();
}

void StoreTest::Reopen(std::chrono::milliseconds busyTimeout) {
    orva::TaskStore::Configure(Options(busyTimeout));
}

std::unique_ptr<orva::TaskStore> StoreTest::OtherProcess() {
    return std::make_unique<orva::TaskStore>(DatabasePath(), Options(std::chrono::seconds(30)));
}

void StoreTest::SetNow(const std::string& utc) {
    absl::Time time;
    std::string error;
    if (!absl::ParseTime("%Y-%m-%d %H:%M:%S", utc, &time, &error)) {
        throw std::runtime_error(error);
    }
    *nowSecond = absl::ToUnixSeconds(time);
}

orva::TaskData StoreTest::SampleTask(const std::string& name) {
    orva::TaskData task;
    task.name = name;
    task.owner = "root";
    task.app = "ORVA.ZUM.TaskScheduler.Script";
    task.command = "true";
    task.schedule.firstMinute = 6 * 60 + 30;
    return task;
}

std::vector<int> StoreTest::Ids(const orva::Snapshot& snapshot) {
    std::vector<int> ids;
    for (const orva::SharedTask& task : snapshot.Tasks()) {
        ids.push_back(task->id);
    }
    return ids;
}

std::string InOwnMounts(const std::function<std::string()>& work) {
    int channel[2];
    if (::pipe(channel) != 0) {
        return "no pipe";
    }
    const pid_t child = ::fork();
    if (child == 0) {
        std::string outcome = EnterOwnMounts();
        if (outcome.empty()) {
            try {
                outcome = work();
            } catch (const std::exception& error) {
                outcome = error.what();
            }
        }
        const bool told = ::write(channel[1], outcome.data(), outcome.size()) ==
                          static_cast<ssize_t>(outcome.size());
        ::_exit(told ? 0 : 1);
    }
    ::close(channel[1]);
    std::string outcome;
    char buffer[512];
    for (ssize_t length = 0; (length = ::read(channel[0], buffer, sizeof buffer)) > 0;) {
        outcome.append(buffer, static_cast<std::size_t>(length));
    }
    ::close(channel[0]);
    int status = 0;
    if (::waitpid(child, &status, 0) != child || status != 0) {
        return "the child ended with status " + std::to_string(status) + ": " + outcome;
    }
    return outcome;
}
