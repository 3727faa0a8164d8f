#include "appliance/modules/EditorSchedule.h"

#include <gtest/gtest.h>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

Json::Value Form(const char* text) {
    std::string error;
    return ParseStrictJson(text, error).value();
}

TEST(EditorSchedule, TheEditorsNamesStandForTheStoredOnes) {
    Schedule schedule;
    EXPECT_EQ(ReadEditorSchedule(Form(R"({"mode":"date","date":"2026-05-31","repeat_date":"monthly",
                  "week_day":"1","hour":6,"minute":30,"interval_min":15,"last_hour":7,
                  "last_min":45,"run_missed":true})"),
                                 schedule),
              std::nullopt);
    Schedule expected;
    expected.mode = Schedule::Mode::kDate;
    expected.date = absl::CivilDay(2026, 5, 31);
    expected.repeat = Schedule::Repeat::kMonthly;
    expected.weekDays = 0b10;
    expected.firstMinute = 390;
    expected.intervalMinutes = 15;
    expected.lastMinute = 465;
    expected.runMissed = true;
    EXPECT_EQ(schedule, expected);
}

TEST(EditorSchedule, WhatIsAbsentOrNullIsThatOfANewTask) {
    Schedule schedule;
    schedule.firstMinute = 5;
    EXPECT_EQ(ReadEditorSchedule(Form(R"({"minute":null,"week_day":null})"), schedule),
              std::nullopt);
    EXPECT_EQ(schedule, Schedule());
}

TEST(EditorSchedule, ARefusalNamesTheMemberAsTheEditorKnowsItAndChangesNothing) {
    Schedule schedule;
    schedule.firstMinute = 5;
    const Schedule before = schedule;
    EXPECT_EQ(ReadEditorSchedule(Form(R"({"hour":1,"minute":true})"), schedule),
              "schedule.minute: is no integer from 0 to 59");
    EXPECT_EQ(ReadEditorSchedule(Form(R"({"week_day":"7"})"), schedule),
              "schedule.week_day: is no list of days from 0 (Sunday) to 6, as in \"1,3,5\"");
    EXPECT_EQ(ReadEditorSchedule(Form(R"({"hour":24})"), schedule),
              "schedule.hour: is no integer from 0 to 23");
    EXPECT_EQ(ReadEditorSchedule(Form("[]"), schedule), "schedule: is no object");
    EXPECT_EQ(schedule, before);
}

}  // namespace
}  // namespace orva
