#include "appliance/runs/RunDocument.h"

#include <gtest/gtest.h>

#include "appliance/webapi/JsonWriter.h"

namespace orva {
namespace {

TEST(RunDocument, AnInstantHasMilliseconds) {
    EXPECT_EQ(FormatInstant(absl::FromUnixSeconds(1800000000)), "2027-01-15T08:00:00.000Z");
    EXPECT_EQ(FormatInstant(absl::FromUnixMillis(1800000000007)), "2027-01-15T08:00:00.007Z");
    // Cut, not rounded: an instant is never shown before it has come.
    EXPECT_EQ(FormatInstant(absl::FromUnixMicros(1800000000999999)), "2027-01-15T08:00:00.999Z");
    EXPECT_EQ(FormatInstant(absl::FromUnixMillis(-1)), "1969-12-31T23:59:59.999Z");
}

TEST(RunDocument, WhatARunDoesNotHaveIsNull) {
    orva::Run run;
    run.id = 12;
    run.task = 3;
    run.taskName = "Lunch signal";
    run.queuedAt = absl::FromUnixMillis(1800000000123);
    EXPECT_EQ(WriteJson(RunDocument(run)),
              R"({"asked_account":"","asked_program":"","ended":null,"exit_status":null,)"
              R"("name":"Lunch signal","occurrence":null,"output":0,)"
              R"("queued":"2027-01-15T08:00:00.123Z","reason":"hand","run":12,"signal":null,)"
              R"("started":null,"state":"queued","task":3,"why":""})");
}

TEST(RunDocument, AWholeRunComesWhole) {
    orva::Run run;
    run.id = 9007199254740993;
    run.task = 2147483647;
    run.occurrence = absl::FromUnixSeconds(1800000000);
    run.reason = RunReason::kSchedule;
    run.state = RunState::kEnded;
    run.why = "w";
    run.queuedAt = absl::FromUnixMillis(1800000000001);
    run.askedProgram = "p";
    run.askedAccount = "a";
    run.startedAt = absl::FromUnixMillis(1800000000002);
    run.endedAt = absl::FromUnixMillis(1800000000003);
    run.exitStatus = 255;
    run.outputBytes = 18446744073709551615U;
    EXPECT_EQ(WriteJson(RunDocument(run)),
              R"({"asked_account":"a","asked_program":"p","ended":"2027-01-15T08:00:00.003Z",)"
              R"("exit_status":255,"name":"","occurrence":"2027-01-15T08:00:00.000Z",)"
              R"("output":18446744073709551615,"queued":"2027-01-15T08:00:00.001Z",)"
              R"("reason":"schedule","run":9007199254740993,"signal":null,)"
              R"("started":"2027-01-15T08:00:00.002Z","state":"ended","task":2147483647,)"
              R"("why":"w"})");
}

TEST(RunDocument, TheTextsOfReasonsAndStatesAreReadBack) {
    EXPECT_EQ(ParseRunReason("missed"), RunReason::kMissed);
    EXPECT_EQ(ParseRunState("lost"), RunState::kLost);
    EXPECT_EQ(RunReasonText(RunReason::kByHand), "hand");
    EXPECT_EQ(RunStateText(RunState::kSkipped), "skipped");
    EXPECT_EQ(ParseRunReason("Hand"), std::nullopt);
    EXPECT_EQ(ParseRunState(""), std::nullopt);
}

}  // namespace
}  // namespace orva
