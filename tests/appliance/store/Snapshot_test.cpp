#include "appliance/store/Snapshot.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace {

using orva::SharedTask;
using orva::Snapshot;
using orva::SortKey;
using orva::TaskData;
using testing::ElementsAre;

// Noon UTC of Friday, 1 May 2026.
const absl::Time kNoon = absl::FromUnixSeconds(1777636800);

SharedTask Task(int id, const std::string& name, int firstMinute, bool enabled = true) {
    TaskData task;
    task.id = id;
    task.name = name;
    task.schedule.firstMinute = firstMinute;
    task.Set(orva::kEnabled, enabled);
    return std::make_shared<const TaskData>(task);
}

absl::TimeZone Zone(const std::string& name) {
    absl::TimeZone zone;
    EXPECT_TRUE(absl::LoadTimeZone(name, &zone));
    return zone;
}

TEST(Snapshot, FindsTasksByTheirId) {
    const Snapshot snapshot({Task(2, "a", 0), Task(5, "b", 0), Task(9, "c", 0)},
                            absl::UTCTimeZone(), kNoon);
    EXPECT_EQ(snapshot.Find(5), 1U);
    EXPECT_EQ(snapshot.Find(9), 2U);
    for (const int id : {-1, 0, 3, 10}) {
        EXPECT_EQ(snapshot.Find(id), std::nullopt);
    }
}

TEST(Snapshot, HoldsUntilItsEarliestNextStart) {
    const Snapshot snapshot({Task(1, "a", 780), Task(2, "b", 750), Task(3, "off", 721, false)},
                            absl::UTCTimeZone(), kNoon);
    EXPECT_TRUE(snapshot.HoldsFor(absl::UTCTimeZone(), kNoon));
    EXPECT_TRUE(
        snapshot.HoldsFor(absl::UTCTimeZone(), kNoon + absl::Minutes(30) - absl::Seconds(1)));
    EXPECT_FALSE(snapshot.HoldsFor(absl::UTCTimeZone(), kNoon + absl::Minutes(30)));
    EXPECT_FALSE(snapshot.HoldsFor(absl::UTCTimeZone(), kNoon - absl::Seconds(1)));
    EXPECT_FALSE(snapshot.HoldsFor(Zone("Europe/Berlin"), kNoon));
}

TEST(Snapshot, WithoutAnyNextStartItHoldsForEver) {
    const Snapshot snapshot({Task(1, "off", 721, false)}, absl::UTCTimeZone(), kNoon);
    EXPECT_EQ(snapshot.NextStart(0), orva::kNoStart);
    EXPECT_TRUE(snapshot.HoldsFor(absl::UTCTimeZone(), kNoon + absl::Hours(1000000)));
}

TEST(Snapshot, AnOrderKnowsTheWayBack) {
    const Snapshot snapshot({Task(1, "b", 0), Task(2, "c", 0), Task(3, "a", 0)},
                            absl::UTCTimeZone(), kNoon);
    const orva::SortOrder& order = snapshot.Order(SortKey::kName, true);
    EXPECT_THAT(order.order, ElementsAre(2, 0, 1));
    EXPECT_THAT(order.rankOf, ElementsAre(1, 2, 0));
    EXPECT_EQ(&snapshot.Order(SortKey::kName, true), &order);
    EXPECT_THAT(snapshot.Order(SortKey::kName, false).order, ElementsAre(1, 0, 2));
}

TEST(Snapshot, EqualTasksKeepTheirOrderInBothDirections) {
    const Snapshot snapshot({Task(1, "b", 0), Task(2, "a", 0), Task(3, "b", 0), Task(4, "a", 0)},
                            absl::UTCTimeZone(), kNoon);
    EXPECT_THAT(snapshot.Order(SortKey::kName, true).order, ElementsAre(1, 3, 0, 2));
    EXPECT_THAT(snapshot.Order(SortKey::kName, false).order, ElementsAre(0, 2, 1, 3));
}

TEST(Snapshot, KeysHaveTheirNames) {
    EXPECT_EQ(orva::ParseSortKey("state"), SortKey::kState);
    EXPECT_EQ(orva::ParseSortKey("id"), SortKey::kId);
    EXPECT_EQ(orva::ParseSortKey("app name"), SortKey::kAppName);
    EXPECT_EQ(orva::ParseSortKey("name"), SortKey::kName);
    EXPECT_EQ(orva::ParseSortKey("action"), SortKey::kAction);
    EXPECT_EQ(orva::ParseSortKey("next trigger time"), SortKey::kNextStart);
    EXPECT_EQ(orva::ParseSortKey("owner"), std::nullopt);
}

}  // namespace
