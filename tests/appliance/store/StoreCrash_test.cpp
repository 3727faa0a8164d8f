// A writer that is killed in the middle of its work.
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <set>
#include <vector>

#include "tests/appliance/store/StoreTest.h"

namespace {

using StoreCrashTest = StoreTest;
using orva::TaskStore;

// Starts a process that stores tasks without end and writes each id, once it is acknowledged, into
// the channel.
pid_t StartWriter(int channel, const orva::TaskData& task) {
    const pid_t child = ::fork();
    if (child != 0) {
        return child;
    }
    try {
        for (;;) {
            const int id = TaskStore::Current()->Save(task);
            if (::write(channel, &id, sizeof id) != sizeof id) {
                ::_exit(1);
            }
        }
    } catch (...) {
        ::_exit(2);
    }
}

TEST_F(StoreCrashTest, EveryAcknowledgedTaskSurvivesAKillOfItsWriter) {
    constexpr int kRounds = 10;
    orva::TaskData task = SampleTask("x");
    task.appArgs = std::string(3000, 'y');
    std::set<int> acknowledged;
    for (int round = 0; round < kRounds; ++round) {
        int channel[2];
        ASSERT_EQ(::pipe(channel), 0);
        // The child must not inherit connections.
        Reopen();
        const pid_t writer = StartWriter(channel[1], task);
        ASSERT_GT(writer, 0);
        ::close(channel[1]);
        int id = 0;
        for (int count = 0; count < 5 + round; ++count) {
            ASSERT_EQ(::read(channel[0], &id, sizeof id), ssize_t{sizeof id});
            acknowledged.insert(id);
        }
        ::kill(writer, SIGKILL);
        // What it acknowledged before the signal arrived counts too.
        while (::read(channel[0], &id, sizeof id) == ssize_t{sizeof id}) {
            acknowledged.insert(id);
        }
        ::close(channel[0]);
        int status = 0;
        ASSERT_EQ(::waitpid(writer, &status, 0), writer);
        ASSERT_TRUE(WIFSIGNALED(status));

        std::set<int> stored;
        for (const orva::SharedTask& each : TaskStore::Current()->CurrentSnapshot()->Tasks()) {
            EXPECT_EQ(each->appArgs.size(), 3000U);
            stored.insert(each->id);
        }
        EXPECT_TRUE(
            std::includes(stored.begin(), stored.end(), acknowledged.begin(), acknowledged.end()));
        // At most the one that was on its way when the signal came.
        EXPECT_LE(stored.size(), acknowledged.size() + static_cast<std::size_t>(round) + 1);
        SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
        EXPECT_EQ(database.execAndGet("PRAGMA integrity_check").getString(), "ok");
    }
}

}  // namespace
