// What the host of real processes finds in their folders; the processes themselves are looked at in
// the tests of the whole system.
#include "appliance/scheduler/ProcessHost.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <cerrno>
#include <string>
#include <vector>

#include "appliance/supervisor/RunFolder.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

// No file can be opened as long as it lives.
class NoDescriptors {
  public:
    NoDescriptors() {
        ::getrlimit(RLIMIT_NOFILE, &former);
        const rlimit none{0, former.rlim_max};
        ::setrlimit(RLIMIT_NOFILE, &none);
    }
    ~NoDescriptors() { ::setrlimit(RLIMIT_NOFILE, &former); }
    NoDescriptors(const NoDescriptors&) = delete;
    NoDescriptors& operator=(const NoDescriptors&) = delete;

  private:
    rlimit former{};
};

class ProcessHostTest : public Sandbox {
  protected:
    ProcessHostTest() {
        MakeDirectory("/usr/orva/var");
        std::string error;
        EXPECT_TRUE(orva::RunFolder(1).Create({1, 1, "root", "true", {}}, error)) << error;
    }

    static orva::Event NewEvent() {
        sd_event* made = nullptr;
        EXPECT_GE(sd_event_new(&made), 0);
        return orva::Event(made);
    }

    const orva::Event event = NewEvent();
    orva::ProcessHost host{event.get(), "/none", [](std::int64_t) {}};
};

TEST_F(ProcessHostTest, ARunThatHasLeftNoEndingHasOnlyItsOutput) {
    auto writer = orva::OutputWriter::Create(orva::RunFolder(1).Path() + "/output");
    ASSERT_TRUE(writer);
    writer->Append("so far");
    const std::optional<orva::RunRemains> remains = host.Remains(1);
    ASSERT_TRUE(remains);
    EXPECT_FALSE(remains->ending);
    EXPECT_EQ(remains->output.head, "so far");
    ASSERT_TRUE(host.Remains(2));
    EXPECT_FALSE(host.Remains(2)->ending);
    EXPECT_EQ(host.Remains(2)->output.bytes, 0U);
}

TEST_F(ProcessHostTest, WhatCannotBeReadForWantOfDescriptorsIsNotTakenForMissing) {
    orva::RunEnding ending;
    ending.exitStatus = 4;
    Write("/usr/orva/var/runs/1/ending", ToRecords(ending));
    auto writer = orva::OutputWriter::Create(orva::RunFolder(1).Path() + "/output");
    ASSERT_TRUE(writer);
    writer->Append("printed");
    {
        const NoDescriptors none;
        EXPECT_FALSE(host.Remains(1));
        EXPECT_EQ(errno, EMFILE);
        EXPECT_EQ(host.Look(1), orva::RunHost::Trace::kGoesOn);
    }
    const std::optional<orva::RunRemains> remains = host.Remains(1);
    ASSERT_TRUE(remains);
    EXPECT_EQ(remains->ending, ending);
    EXPECT_EQ(remains->output.head, "printed");
}

// Its libraries are being replaced, for example.
TEST_F(ProcessHostTest, ARunWhoseSupervisorEndsBeforeItsFirstStepHasNotBegun) {
    std::vector<std::int64_t> over;
    orva::ProcessHost started(event.get(), "/bin/false",
                              [&](std::int64_t run) { over.push_back(run); });
    ASSERT_EQ(started.Prepare({2, 1, "root", "true", {}}), std::nullopt);
    ASSERT_EQ(started.Start(2), std::nullopt);
    while (over.empty()) {
        ASSERT_GT(sd_event_run(event.get(), 10'000'000), 0);
    }
    EXPECT_EQ(over, std::vector<std::int64_t>{2});
    const std::optional<orva::RunRemains> remains = started.Remains(2);
    ASSERT_TRUE(remains);
    ASSERT_TRUE(remains->ending);
    EXPECT_FALSE(remains->ending->started);
    EXPECT_EQ(remains->ending->why, "cannot start /bin/false: it ended before its first step");
    started.Remove(2);
    EXPECT_FALSE(started.Remains(2)->ending);
}

}  // namespace
