#include "appliance/schedule/ScheduleSection.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/writer.h>

#include <memory>
#include <stdexcept>
#include <string>

namespace orva {
namespace {

Json::Value Parse(const std::string& text) {
    Json::CharReaderBuilder builder;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string errors;
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
        throw std::runtime_error(errors);
    }
    return value;
}

std::string Write(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

// What is wrong with the section for a new task; "" when it is taken.
std::string ProblemOf(const std::string& section) {
    Schedule schedule;
    const std::optional<std::string> problem = ApplyScheduleSection(Parse(section), schedule);
    if (problem) {
        EXPECT_EQ(schedule, Schedule()) << section;
    }
    return problem.value_or("");
}

TEST(ScheduleSection, ANewScheduleIsEveryDayAtMidnight) {
    EXPECT_EQ(Write(ScheduleSection(Schedule())),
              R"({"date":"","hour":0,"interval_min":0,"last_hour":23,"last_min":59,"min":0,)"
              R"("mode":"weekly","repeat":"never","run_missed":false,)"
              R"("week_name":"0,1,2,3,4,5,6"})");
}

TEST(ScheduleSection, EveryMemberComesBackAsItWent) {
    const std::string text =
        R"({"date":"2028-02-29","hour":7,"interval_min":90,"last_hour":21,"last_min":45,"min":5,)"
        R"("mode":"date","repeat":"half_yearly","run_missed":true,"week_name":"0,6"})";
    Schedule schedule;
    EXPECT_EQ(ApplyScheduleSection(Parse(text), schedule), std::nullopt);
    EXPECT_EQ(Write(ScheduleSection(schedule)), text);
    EXPECT_EQ(schedule.firstMinute, 425);
    EXPECT_EQ(schedule.lastMinute, 1305);
    EXPECT_EQ(schedule.weekDays, 0b1000001);
}

TEST(ScheduleSection, EveryModeAndRepeatHasItsWord) {
    for (const char* repeat :
         {"never", "daily", "weekly", "monthly", "quarterly", "half_yearly", "yearly"}) {
        Json::Value section(Json::objectValue);
        section["repeat"] = repeat;
        Schedule schedule;
        EXPECT_EQ(ApplyScheduleSection(section, schedule), std::nullopt);
        EXPECT_EQ(ScheduleSection(schedule)["repeat"], Json::Value(repeat));
    }
}

TEST(ScheduleSection, AbsentAndNullMembersKeepWhatIsThere) {
    Schedule schedule;
    schedule.weekDays = 0b10;
    schedule.firstMinute = 605;
    schedule.intervalMinutes = 30;
    schedule.runMissed = true;
    Schedule expected = schedule;
    expected.firstMinute = 620;
    EXPECT_EQ(ApplyScheduleSection(
                  Parse(R"({"min":20,"hour":null,"week_name":null,"repeat":null,"date":null})"),
                  schedule),
              std::nullopt);
    EXPECT_EQ(schedule, expected);
    EXPECT_EQ(ApplyScheduleSection(Json::Value(), schedule), std::nullopt);
    EXPECT_EQ(schedule, expected);
}

TEST(ScheduleSection, UnknownMembersAndTheNextStartAreIgnored) {
    EXPECT_EQ(ProblemOf(R"({"colour":1,"next_trigger_time":"2030-01-01 00:00"})"), "");
    EXPECT_TRUE(IsScheduleMember("next_trigger_time"));
    EXPECT_TRUE(IsScheduleMember("week_name"));
    EXPECT_FALSE(IsScheduleMember("colour"));
}

TEST(ScheduleSection, DaysMayComeInAnyOrder) {
    Schedule schedule;
    EXPECT_EQ(ApplyScheduleSection(Parse(R"({"week_name":"5,1,3"})"), schedule), std::nullopt);
    EXPECT_EQ(ScheduleSection(schedule)["week_name"], Json::Value("1,3,5"));
}

TEST(ScheduleSection, ATaskWithoutADateGivesAnEmptyOneAndTakesItBack) {
    EXPECT_EQ(ProblemOf(R"({"mode":"weekly","date":""})"), "");
    EXPECT_EQ(ProblemOf(R"({"mode":"date","date":"2030-01-31","week_name":""})"), "");
}

TEST(ScheduleSection, NamesTheFirstMemberThatIsWrong) {
    EXPECT_EQ(ProblemOf(R"({"hour":24,"min":-1})"), "schedule.hour: is no integer from 0 to 23");
    EXPECT_EQ(ProblemOf(R"({"min":60})"), "schedule.min: is no integer from 0 to 59");
    EXPECT_EQ(ProblemOf(R"({"mode":"hourly"})"), "schedule.mode: is none of weekly, date");
    EXPECT_EQ(ProblemOf(R"({"repeat":"Daily"})"),
              "schedule.repeat: is none of never, daily, weekly, monthly, quarterly, half_yearly, "
              "yearly");
    EXPECT_EQ(ProblemOf(R"({"interval_min":1440})"),
              "schedule.interval_min: is no integer from 0 to 1439");
    EXPECT_EQ(ProblemOf(R"({"week_name":""})"), "schedule.week_name: names no day");
    EXPECT_EQ(ProblemOf(R"({"mode":"date"})"), "schedule.date: is missing");
    EXPECT_EQ(ProblemOf(R"({"mode":"date","date":""})"), "schedule.date: is missing");
    EXPECT_EQ(ProblemOf(R"({"hour":10,"interval_min":5,"last_hour":9})"),
              "schedule.last_hour: the last start of the day is before the first");
    EXPECT_EQ(ProblemOf("[]"), "schedule: is no object");
    EXPECT_EQ(ProblemOf("\"weekly\""), "schedule: is no object");
}

TEST(ScheduleSection, ALastStartBeforeTheFirstDoesNotMatterToAOnceADayTask) {
    EXPECT_EQ(ProblemOf(R"({"hour":20,"interval_min":0,"last_hour":18})"), "");
}

TEST(ScheduleSection, RefusesTheWrongTypeForEveryMember) {
    for (const char* member : {"mode", "week_name", "date", "repeat"}) {
        for (const char* value : {"1", "true", "[]", "{}", "1.5"}) {
            EXPECT_EQ(ProblemOf("{\"" + std::string(member) + "\":" + value + "}"),
                      "schedule." + std::string(member) + ": is no text");
        }
    }
    for (const char* member : {"hour", "min", "interval_min", "last_hour", "last_min"}) {
        for (const char* value : {"\"1\"", "true", "[]", "{}", "1.0", "-1", "99999", "99999999999",
                                  "18446744073709551615"}) {
            EXPECT_NE(ProblemOf("{\"" + std::string(member) + "\":" + value + "}"), "")
                << member << " " << value;
        }
    }
    for (const char* value : {"\"true\"", "1", "[]", "{}"}) {
        EXPECT_EQ(ProblemOf("{\"run_missed\":" + std::string(value) + "}"),
                  "schedule.run_missed: is neither true nor false");
    }
}

TEST(ScheduleSection, RefusesDaysThatAreNone) {
    for (const char* days : {"7", "1,", ",1", "1,,2", "1 ,2", "1;2", "mon", "-1", "12", "1,2,"}) {
        EXPECT_EQ(ProblemOf("{\"week_name\":\"" + std::string(days) + "\"}"),
                  "schedule.week_name: is no list of days from 0 (Sunday) to 6, as in \"1,3,5\"")
            << days;
    }
}

TEST(ScheduleSection, RefusesDatesThatDoNotExist) {
    for (const char* date :
         {"2026-02-29", "2026-13-01", "2026-00-10", "2026-04-31", "2026-1-1", "1969-12-31",
          "20260101", "2026/01/01", "2026-01-01 ", "+026-01-01", "2026--1-01", "tomorrow"}) {
        EXPECT_EQ(ProblemOf("{\"date\":\"" + std::string(date) + "\"}"),
                  "schedule.date: is no date from 1970-01-01 on, as in \"2030-12-31\"")
            << date;
    }
    EXPECT_EQ(ProblemOf(R"({"date":"2028-02-29"})"), "");
}

}  // namespace
}  // namespace orva
