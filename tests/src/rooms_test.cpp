#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <initializer_list>
#include <string>
#include <vector>

namespace {

using ::testing::IsEmpty;

// The include lines below `rooms` that name a file of one of `forbidden`, as "file: line".
std::vector<std::string> IncludesOf(std::initializer_list<const char*> rooms,
                                    std::initializer_list<const char*> forbidden, int& files) {
    std::vector<std::string> found;
    for (const std::string room : rooms) {
        for (const auto& entry : std::filesystem::recursive_directory_iterator(
                 std::filesystem::path(ORVA_SOURCE_DIR) / room)) {
            const std::string extension = entry.path().extension();
            if (extension != ".h" && extension != ".cpp") {
                continue;
            }
            ++files;
            std::ifstream file(entry.path());
            std::string line;
            while (std::getline(file, line)) {
                for (const std::string name : forbidden) {
                    if (line.starts_with("#include") && line.find(name) != std::string::npos) {
                        found.push_back(entry.path().filename().string() + ": " + line);
                    }
                }
            }
        }
    }
    return found;
}

TEST(RoomsTest, TheModuleKnowsNothingOfTheAppliance) {
    int files = 0;
    EXPECT_THAT(IncludesOf({"src", "include"}, {"\"appliance/", "<appliance/", "\"tests/"}, files),
                IsEmpty());
    EXPECT_GT(files, 10);
}

TEST(RoomsTest, TheApplianceKnowsNothingOfTheModule) {
    int files = 0;
    EXPECT_THAT(IncludesOf({"appliance"}, {"\"include/", "\"src/", "<include/", "\"tests/"}, files),
                IsEmpty());
    EXPECT_GT(files, 1);
}

TEST(RoomsTest, ThePlatformsDeclarationsRestOnNothingButThemselves) {
    int files = 0;
    EXPECT_THAT(
        IncludesOf({"platform"}, {"\"include/", "\"src/", "\"appliance/", "\"tests/"}, files),
        IsEmpty());
    EXPECT_EQ(files, 7);
}

}  // namespace
