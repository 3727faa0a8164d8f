#include "appliance/tools/ServiceTable.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <iterator>

#include "tests/appliance/util/Sandbox.h"

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class ServiceTableTest : public Sandbox {
  protected:
    std::string Shipped() const { return RootPath() + "/usr/orva/share/services.json"; }
    std::string Own() const { return RootPath() + "/usr/orva/etc/services.json"; }

    void Ship(const std::string& services) const {
        Write("/usr/orva/share/services.json", R"({"services": )" + services + "}");
    }
    void Set(const std::string& services) const {
        Write("/usr/orva/etc/services.json", R"({"services": )" + services + "}");
    }
    std::string LoadError() const {
        std::string error;
        EXPECT_FALSE(LoadServiceTable(error).has_value());
        return error;
    }
};

TEST_F(ServiceTableTest, ReadsUnitsAndCommands) {
    std::string error;
    const auto table = ParseServiceTable(
        R"({"services": {"FTP": {"units": ["a.service", "b@c.socket"], "seconds": 7, "x": 1},
                         "N T": {"start": "run 'it'", "stop": "kill it"}}, "y": null})",
        error);
    ASSERT_TRUE(table.has_value()) << error;
    ASSERT_EQ(table->size(), 2U);
    EXPECT_THAT(table->at("FTP").units, ElementsAre("a.service", "b@c.socket"));
    EXPECT_EQ(table->at("FTP").limit, std::chrono::seconds(7));
    EXPECT_THAT(table->at("N T").units, IsEmpty());
    EXPECT_EQ(table->at("N T").startCommand, "run 'it'");
    EXPECT_EQ(table->at("N T").stopCommand, "kill it");
    EXPECT_EQ(table->at("N T").limit, std::chrono::seconds(60));
}

TEST_F(ServiceTableTest, RefusesOtherTablesAndSaysWhy) {
    const auto errorOf = [](const std::string& content) {
        std::string error;
        EXPECT_FALSE(ParseServiceTable(content, error).has_value()) << content;
        return error;
    };
    const auto errorOfEntry = [&errorOf](const std::string& entry) {
        return errorOf(R"({"services": {"A": )" + entry + "}}");
    };
    EXPECT_EQ(errorOf("[]"), "the document is no object");
    EXPECT_EQ(errorOf("{}"), "\"services\" is no object");
    EXPECT_EQ(errorOf(R"({"services": []})"), "\"services\" is no object");
    EXPECT_EQ(errorOfEntry("null"), "\"A\" is no object");
    const std::string neither =
        "\"A\" has neither \"units\" nor the commands \"start\" and \"stop\"";
    EXPECT_EQ(errorOfEntry("{}"), neither);
    EXPECT_EQ(errorOfEntry(R"({"start": "x"})"), neither);
    EXPECT_EQ(errorOfEntry(R"({"start": "x", "stop": ""})"), neither);
    EXPECT_EQ(errorOfEntry(R"({"start": 1, "stop": "x"})"), neither);
    EXPECT_EQ(errorOfEntry(R"({"units": ["a.service"], "stop": "x"})"),
              "\"A\" has both \"units\" and commands");
    const std::string noUnits = "\"A\" \"units\" is no list of unit names";
    for (const char* units :
         {"null", "{}", "[]", "[1]", R"([""])", R"(["a"])", R"(["--now.service"])",
          R"(["a.service b"])", R"(["*.service"])", R"(["/etc/a.service"])"}) {
        EXPECT_EQ(errorOfEntry(R"({"units": )" + std::string(units) + "}"), noUnits) << units;
    }
    for (const char* seconds :
         {"0", "3601", "-1", "1.0", "\"1\"", "null", "99999999999999999999"}) {
        EXPECT_EQ(
            errorOfEntry(R"({"units": ["a.service"], "seconds": )" + std::string(seconds) + "}"),
            "\"A\" \"seconds\" is no whole number from 1 to 3600")
            << seconds;
    }
}

TEST_F(ServiceTableTest, TheAppliancesOwnEntriesReplaceShippedOnes) {
    Ship(R"({"A": {"units": ["a.service"], "seconds": 5}, "B": {"units": ["b.service"]}})");
    Set(R"({"A": {"start": "up", "stop": "down"}, "C": {"units": ["c.service"]}})");
    std::string error;
    const auto table = LoadServiceTable(error);
    ASSERT_TRUE(table.has_value()) << error;
    EXPECT_EQ(table->size(), 3U);
    EXPECT_THAT(table->at("A").units, IsEmpty());
    EXPECT_EQ(table->at("A").startCommand, "up");
    EXPECT_EQ(table->at("A").limit, std::chrono::seconds(60));
    EXPECT_THAT(table->at("B").units, ElementsAre("b.service"));
    EXPECT_THAT(table->at("C").units, ElementsAre("c.service"));
}

TEST_F(ServiceTableTest, OneTableIsEnough) {
    std::string error;
    EXPECT_EQ(LoadError(), Shipped() + ": No such file or directory");
    Ship(R"({"A": {"units": ["a.service"]}})");
    EXPECT_EQ(LoadServiceTable(error)->size(), 1U);
    std::filesystem::rename(Shipped(), RootPath() + "/away");
    Set(R"({"B": {"units": ["b.service"]}, "C": {"units": ["b.service"]}})");
    EXPECT_EQ(LoadServiceTable(error)->size(), 2U);
    EXPECT_EQ(error, "");
}

TEST_F(ServiceTableTest, ADamagedTableIsNotPassedOver) {
    Ship(R"({"A": {"units": ["a.service"]}})");
    Set("[]");
    EXPECT_EQ(LoadError(), Own() + ": \"services\" is no object");
    Set(R"({"A": {"units": ["a.service"]}})");
    Ship("{");
    EXPECT_EQ(LoadError().substr(0, Shipped().size() + 2), Shipped() + ": ");
    std::filesystem::remove(Shipped());
    MakeDirectory("/usr/orva/share/services.json");
    EXPECT_EQ(LoadError().substr(0, Shipped().size() + 2), Shipped() + ": ");
}

TEST_F(ServiceTableTest, TheShippedTableKnowsEveryServiceThatTasksCanChoose) {
    std::ifstream file(ORVA_SOURCE_DIR "/appliance/tools/data/services.json");
    const std::string content{std::istreambuf_iterator<char>(file), {}};
    std::string error;
    const auto table = ParseServiceTable(content, error);
    ASSERT_TRUE(table.has_value()) << error;
    std::vector<std::string> names;
    for (const auto& [name, service] : *table) {
        names.push_back(name);
    }
    EXPECT_THAT(names, testing::UnorderedElementsAre("Samba", "AFP", "BonjourPrinter", "NFS",
                                                     "AutoBlock", "FTP", "FTPES", "SFTP", "WebDeck",
                                                     "WebDAV", "SecureWebDAV", "NTP"));
}

}  // namespace
}  // namespace orva
