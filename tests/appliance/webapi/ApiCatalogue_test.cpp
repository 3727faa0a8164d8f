#include "appliance/webapi/ApiCatalogue.h"

#include <gtest/gtest.h>

namespace {

using orva::ApiCatalogue;

void First(ORVA::APIRequest*, ORVA::APIResponse*) {}
void Second(ORVA::APIRequest*, ORVA::APIResponse*) {}

ApiCatalogue Example() {
    ApiCatalogue catalogue;
    std::string conflict;
    EXPECT_TRUE(catalogue.Add({{"Tasks", 1, "list", &First},
                               {"Tasks", 1, "delete", &Second},
                               {"Tasks", 2, "list", &Second},
                               {"Shares", 1, "list", &First}},
                              conflict));
    return catalogue;
}

TEST(ApiCatalogue, FindsAMethodByApiVersionAndName) {
    const ApiCatalogue catalogue = Example();
    EXPECT_EQ(catalogue.Lookup("Tasks", 1, "list").found, ApiCatalogue::Found::kMethod);
    EXPECT_EQ(catalogue.Lookup("Tasks", 1, "list").function, &First);
    EXPECT_EQ(catalogue.Lookup("Tasks", 2, "list").function, &Second);
}

TEST(ApiCatalogue, TellsWhatOfAnUnknownMethodIsUnknown) {
    const ApiCatalogue catalogue = Example();
    EXPECT_EQ(catalogue.Lookup("tasks", 1, "list").found, ApiCatalogue::Found::kUnknownApi);
    EXPECT_EQ(catalogue.Lookup("Tasks", 3, "list").found, ApiCatalogue::Found::kUnknownVersion);
    EXPECT_EQ(catalogue.Lookup("Tasks", 2, "delete").found, ApiCatalogue::Found::kUnknownMethod);
    EXPECT_EQ(catalogue.Lookup("Tasks", 2, "delete").function, nullptr);
}

TEST(ApiCatalogue, TakesNothingOfATableThatAddsToAnothersApi) {
    ApiCatalogue catalogue = Example();
    std::string conflict;
    EXPECT_FALSE(
        catalogue.Add({{"New", 1, "good", &First}, {"Tasks", 1, "purge", &First}}, conflict));
    EXPECT_EQ(conflict, "another module has Tasks 1 already");
    EXPECT_EQ(catalogue.Lookup("New", 1, "good").found, ApiCatalogue::Found::kUnknownApi);
    EXPECT_EQ(catalogue.Lookup("Tasks", 1, "purge").found, ApiCatalogue::Found::kUnknownMethod);
}

TEST(ApiCatalogue, TakesAnotherVersionOfAnApiFromAnotherTable) {
    ApiCatalogue catalogue = Example();
    std::string conflict;
    EXPECT_TRUE(catalogue.Add({{"Tasks", 3, "list", &First}}, conflict));
    EXPECT_EQ(catalogue.Lookup("Tasks", 3, "list").function, &First);
    EXPECT_EQ(catalogue.Lookup("Tasks", 2, "list").function, &Second);
}

TEST(ApiCatalogue, TakesNothingOfATableThatRepeatsAMethod) {
    ApiCatalogue catalogue = Example();
    std::string conflict;
    EXPECT_FALSE(
        catalogue.Add({{"New", 1, "good", &First}, {"Tasks", 2, "list", &First}}, conflict));
    EXPECT_EQ(conflict, "another module has Tasks 2 already");
    EXPECT_EQ(catalogue.Lookup("New", 1, "good").found, ApiCatalogue::Found::kUnknownApi);
    EXPECT_EQ(catalogue.Lookup("Tasks", 2, "list").function, &Second);
}

TEST(ApiCatalogue, TakesNothingOfATableThatRepeatsItself) {
    ApiCatalogue catalogue;
    std::string conflict;
    EXPECT_FALSE(catalogue.Add({{"A", 1, "m", &First}, {"A", 1, "m", &Second}}, conflict));
    EXPECT_EQ(conflict, "another row has A 1 m already");
    EXPECT_EQ(catalogue.Lookup("A", 1, "m").found, ApiCatalogue::Found::kUnknownApi);
}

TEST(ApiCatalogue, DescribesItselfInOrder) {
    const Json::Value description = Example().Describe();
    ASSERT_EQ(description.size(), 3U);
    EXPECT_EQ(description[0]["api"], "Shares");
    EXPECT_EQ(description[1]["api"], "Tasks");
    EXPECT_EQ(description[1]["version"], 1);
    ASSERT_EQ(description[1]["methods"].size(), 2U);
    EXPECT_EQ(description[1]["methods"][0], "delete");
    EXPECT_EQ(description[1]["methods"][1], "list");
    EXPECT_EQ(description[2]["version"], 2);
}

TEST(ApiCatalogue, DescribesNothingAsAnEmptyArray) {
    const Json::Value description = ApiCatalogue().Describe();
    EXPECT_TRUE(description.isArray());
    EXPECT_TRUE(description.empty());
}

}  // namespace
