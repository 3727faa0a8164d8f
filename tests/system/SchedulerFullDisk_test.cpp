// A disk that becomes full under a running scheduler, and has space again.
#include <absl/time/clock.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <filesystem>
#include <string>

#include "appliance/supervisor/RunFolder.h"
#include "tests/appliance/store/StoreTest.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::Run;
using orva::RunState;
using orva::TaskStore;
using orva::test::RunningScheduler;
using orva::test::WaitFor;

// Takes all that is left of the disk.
void Fill(const std::string& file) {
    std::FILE* const filler = std::fopen(file.c_str(), "wb");
    std::setbuf(filler, nullptr);
    const std::string block(4096, 'x');
    while (std::fwrite(block.data(), 1, block.size(), filler) == block.size()) {
    }
    std::fclose(filler);
}

// Takes all files that may still be made: rows find space, new files do not.
void TakeAllNodes(const std::string& folder) {
    std::filesystem::create_directory(folder);
    for (int node = 0;; ++node) {
        const int file =
            ::open((folder + "/" + std::to_string(node)).c_str(), O_CREAT | O_WRONLY, 0600);
        if (file < 0) {
            return;
        }
        ::close(file);
    }
}

std::string StateOf(const Run& run) {
    return std::string(RunStateText(run.state)) + " " +
           (run.exitStatus ? std::to_string(*run.exitStatus) : run.why);
}

// An appliance with a small disk of its own. One task goes on until it is told to end.
class SmallDisk {
  public:
    SmallDisk()
        : var((appliance.Root().Path() / "usr/orva/var").string()),
          isMounted(::mount("none", var.c_str(), "tmpfs", 0, "size=4m,nr_inodes=200,mode=0770") ==
                    0) {}
    ~SmallDisk() {
        TaskStore::Configure({});
        ::umount2(var.c_str(), MNT_DETACH);
    }
    SmallDisk(const SmallDisk&) = delete;
    SmallDisk& operator=(const SmallDisk&) = delete;

    // Makes a start due when `take` has taken what there is of the disk. Says what went wrong.
    std::string MakeDueAfter(void (*take)(const std::string&)) {
        if (!isMounted) {
            return "cannot mount";
        }
        const std::string go = (appliance.Root().Path() / "go").string();
        appliance.Start();
        goesOn = appliance.AddTask("echo early; until [ -e " + go +
                                   " ]; do sleep 0.01; done; echo late; exit 7");
        due = appliance.AddTask("exit 6");
        TaskStore::Current()->QueueRun(goesOn);
        if (!WaitFor([] {
                const auto output = orva::RunFolder(1).Output();
                return output && output->head == "early\n";
            }) ||
            !appliance.WaitForState(1, RunState::kRunning)) {
            return "does not start";
        }
        appliance.MakeDue(due, absl::Now() + absl::Seconds(2));
        // However long the taking lasts, the start comes after it.
        appliance.Signal(SIGSTOP);
        take(var + "/taken");
        appliance.Signal(SIGCONT);
        appliance.Wake();
        return "";
    }

    bool EndTheFirstRun() {
        appliance.Root().Write("go", "");
        // Its folder is removed as soon as the ending has found space in the database.
        return WaitFor([this] {
            return orva::RunFolder(1).Ending().has_value() ||
                   appliance.OnlyRunOf(goesOn).state == RunState::kEnded;
        });
    }

    // Yields what became of the runs.
    std::string GiveSpace() {
        std::filesystem::remove_all(var + "/taken");
        appliance.Wake();
        appliance.WaitUntilIdle();
        const Run first = appliance.OnlyRunOf(goesOn);
        const std::string told =
            StateOf(first) + " " + orva::RunStore::Current()->Output(first.id)->head + "/ " +
            StateOf(appliance.OnlyRunOf(due)) + " / " + appliance.IntegrityCheck();
        return told + " / " + std::to_string(appliance.Stop());
    }

    RunningScheduler appliance;
    int goesOn = 0;
    int due = 0;

  private:
    const std::string var;
    const bool isMounted;
};

TEST(SchedulerFullDiskTest, NothingIsLostAndStartsAreMadeWhenThereIsSpaceAgain) {
    EXPECT_EQ(InOwnMounts([]() -> std::string {
                  SmallDisk disk;
                  if (const std::string problem = disk.MakeDueAfter(Fill); !problem.empty()) {
                      return problem;
                  }
                  if (!WaitFor([&] {
                          return disk.appliance.ErrorText().find("full") != std::string::npos;
                      })) {
                      return "says nothing of the disk";
                  }
                  return disk.EndTheFirstRun() ? disk.GiveSpace() : "has no space for the ending";
              }),
              "ended 7 early\nlate\n/ ended 6 / ok / 0");
}

TEST(SchedulerFullDiskTest, AStartWhoseOutputHasNoSpaceEndsWithThat) {
    EXPECT_EQ(
        InOwnMounts([]() -> std::string {
            SmallDisk disk;
            if (const std::string problem = disk.MakeDueAfter(TakeAllNodes); !problem.empty()) {
                return problem;
            }
            if (!WaitFor([&] {
                    const auto runs = orva::RunStore::Current()->List({disk.due, {}}, 0, 1).runs;
                    return !runs.empty() && runs.front().state == RunState::kEnded;
                })) {
                return "does not end";
            }
            return disk.EndTheFirstRun() ? disk.GiveSpace() : "has no space for the ending";
        }),
        "ended 7 early\nlate\n/ ended no space for output / ok / 0");
}

}  // namespace
