#include "appliance/supervisor/RunRecords.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

namespace {

using namespace std::string_literals;

orva::RunTime At(std::int64_t microseconds) {
    return orva::RunTime(std::chrono::microseconds(microseconds));
}

TEST(RunRecordsTest, AnOrderIsReadBackAsItWasWritten) {
    const orva::RunOrder order{12,
                               3,
                               "alice",
                               "echo 'a=b'\nexit 3 # \xff",
                               {{"ORVA_ROOT", "/srv/a=b"}, {"TZ", "Europe/Berlin"}}};
    EXPECT_EQ(orva::ToRecords(order),
              "run=12\0task=3\0owner=alice\0command=echo 'a=b'\nexit 3 # \xff\0"
              "env:ORVA_ROOT=/srv/a=b\0env:TZ=Europe/Berlin\0end=\0"s);
    EXPECT_EQ(orva::OrderFromRecords(orva::ToRecords(order)), order);
}

TEST(RunRecordsTest, AnOrderThatWasCutOffIsNone) {
    const std::string records = orva::ToRecords(orva::RunOrder{1, 2, "root", "true", {{"A", "b"}}});
    for (std::size_t length = 0; length < records.size(); ++length) {
        EXPECT_FALSE(orva::OrderFromRecords(records.substr(0, length))) << length;
    }
}

TEST(RunRecordsTest, AnOrderWithAnUnknownRecordOrABadNumberIsNone) {
    EXPECT_FALSE(orva::OrderFromRecords("run=1\0color=red\0end=\0"s));
    EXPECT_FALSE(orva::OrderFromRecords("run=1x\0end=\0"s));
    EXPECT_FALSE(orva::OrderFromRecords("run=99999999999999999999\0end=\0"s));
    EXPECT_FALSE(orva::OrderFromRecords("run\0end=\0"s));
}

TEST(RunRecordsTest, EndingsAreReadBackAsTheyWereWritten) {
    const orva::RunEnding exited{At(1), At(2'000'000), 3, std::nullopt, ""};
    EXPECT_EQ(orva::ToRecords(exited), "started=1\0ended=2000000\0exit=3\0why=\0end=\0"s);
    EXPECT_EQ(orva::EndingFromRecords(orva::ToRecords(exited)), exited);
    const orva::RunEnding killed{At(1), At(2), std::nullopt, 9, ""};
    EXPECT_EQ(orva::EndingFromRecords(orva::ToRecords(killed)), killed);
    const orva::RunEnding never{std::nullopt, At(2), std::nullopt, std::nullopt,
                                "the owner is gone"};
    EXPECT_EQ(orva::ToRecords(never), "ended=2\0why=the owner is gone\0end=\0"s);
    EXPECT_EQ(orva::EndingFromRecords(orva::ToRecords(never)), never);
}

TEST(RunRecordsTest, AnEndingIsReadWhateverFollowsItsLastRecord) {
    const std::string records = "ended=2\0why=x\0end=\0"s + std::string(4000, '\0');
    ASSERT_TRUE(orva::EndingFromRecords(records));
    EXPECT_EQ(orva::EndingFromRecords(records)->why, "x");
}

TEST(RunRecordsTest, AProcessIsKnownBeforeItsCommandIs) {
    const orva::RunProcess process{"boot", 17, 4711, 0};
    const std::string records = orva::SupervisorRecords(process);
    EXPECT_EQ(records, "boot=boot\0start=4711\0supervisor=17\0"s);
    EXPECT_EQ(orva::ProcessFromRecords(records), process);
    EXPECT_EQ(orva::CommandRecords(18, 4712), "commandStart=4712\0command=18\0"s);
    EXPECT_EQ(orva::ProcessFromRecords(records + orva::CommandRecords(18, 4712)),
              (orva::RunProcess{"boot", 17, 4711, 18, 4712}));
    EXPECT_EQ(orva::ProcessFromRecords(records + "comm"), process);
    EXPECT_FALSE(orva::ProcessFromRecords(records.substr(0, records.size() - 1)));
    EXPECT_FALSE(orva::ProcessFromRecords(""));
}

TEST(RunRecordsTest, AStopIsReadWhereverItStandsAmongAProcesssRecords) {
    const std::string records = orva::SupervisorRecords({"boot", 17, 4711, 0});
    EXPECT_EQ(orva::StopRecord(123'456'789), "killAt=123456789\0"s);
    EXPECT_EQ(orva::ProcessFromRecords(orva::StopRecord(5) + records),
              (orva::RunProcess{"boot", 17, 4711, 0, 0, 5}));
    EXPECT_EQ(
        orva::ProcessFromRecords(records + orva::StopRecord(5) + orva::CommandRecords(18, 4712)),
        (orva::RunProcess{"boot", 17, 4711, 18, 4712, 5}));
    EXPECT_FALSE(orva::ProcessFromRecords(orva::StopRecord(5)));
}

TEST(RunRecordsTest, TellsWhenAProcessWasStarted) {
    const std::optional<std::uint64_t> own = orva::ProcessStart(::getpid());
    ASSERT_TRUE(own);
    EXPECT_EQ(orva::ProcessStart(::getpid()), own);
    EXPECT_LE(orva::ProcessStart(1), own);
    EXPECT_FALSE(orva::ProcessStart(-1));
    EXPECT_EQ(orva::BootId().size(), 36U);
}

}  // namespace
