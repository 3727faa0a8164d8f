#include "appliance/tools/Buzzer.h"

#include <gmock/gmock.h>
#include <linux/input.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/appliance/tools/BuzzerTest.h"

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class BuzzerDeviceTest : public BuzzerTest {};

TEST_F(BuzzerDeviceTest, AMachineWithoutInputDevicesHasNone) {
    std::string problem = "before";
    EXPECT_FALSE(HasBuzzer(Places()));
    EXPECT_EQ(OpenBuzzer(Places(), problem), nullptr);
    EXPECT_EQ(problem, "");
}

TEST_F(BuzzerDeviceTest, AKeyboardIsNone) {
    AddInput("input0", "0", "event0");
    AddInput("input1", "", "event1");
    AddInput("input2", "1", "event2");
    AddInput("input3", "6 0", "event3");
    std::string problem;
    EXPECT_FALSE(HasBuzzer(Places()));
    EXPECT_EQ(OpenBuzzer(Places(), problem), nullptr);
    EXPECT_EQ(problem, "");
}

TEST_F(BuzzerDeviceTest, SoundsATone) {
    AddInput("input0", "0", "event0");
    AddInput("input4", "6", "event7");
    EXPECT_TRUE(HasBuzzer(Places()));
    std::string problem;
    const std::unique_ptr<Buzzer> buzzer = OpenBuzzer(Places(), problem);
    ASSERT_NE(buzzer, nullptr) << problem;
    EXPECT_THAT(Sounds("event7"), IsEmpty());
    EXPECT_TRUE(buzzer->Sound());
    EXPECT_TRUE(buzzer->Silence());
    EXPECT_THAT(Sounds("event7"), ElementsAre("tone 1000", "tone 0"));
    EXPECT_THAT(Sounds("event0"), IsEmpty());
}

TEST_F(BuzzerDeviceTest, RingsWhatKnowsNoTones) {
    AddInput("input0", "2", "event0");
    std::string problem;
    const std::unique_ptr<Buzzer> buzzer = OpenBuzzer(Places(), problem);
    ASSERT_NE(buzzer, nullptr) << problem;
    EXPECT_TRUE(buzzer->Sound());
    EXPECT_TRUE(buzzer->Silence());
    EXPECT_THAT(Sounds("event0"), ElementsAre("bell 1", "bell 0"));
}

TEST_F(BuzzerDeviceTest, TakesTheNextOneWhenTheFirstCannotBeOpened) {
    AddInput("input1", "6", "event1");
    AddInput("input2", "6", "event2");
    std::filesystem::remove(NodeOf("event1"));
    std::string problem;
    const std::unique_ptr<Buzzer> buzzer = OpenBuzzer(Places(), problem);
    ASSERT_NE(buzzer, nullptr) << problem;
    EXPECT_TRUE(buzzer->Sound());
    EXPECT_THAT(Sounds("event2"), ElementsAre("tone 1000"));
}

TEST_F(BuzzerDeviceTest, SaysWhyItCannotBeUsed) {
    AddInput("input1", "6", "event1");
    std::filesystem::remove(NodeOf("event1"));
    Write("/dev/console", "");
    BuzzerPlaces places = Places();
    places.consoles = {RootPath() + "/dev/tty0", RootPath() + "/dev/console"};
    std::string problem;
    EXPECT_TRUE(HasBuzzer(places));
    EXPECT_EQ(OpenBuzzer(places, problem), nullptr);
    EXPECT_EQ(problem, NodeOf("event1") + ": No such file or directory; " + RootPath() +
                           "/dev/tty0: No such file or directory; " + RootPath() +
                           "/dev/console: Inappropriate ioctl for device");
}

TEST_F(BuzzerDeviceTest, SaysThatADeviceHasNoNode) {
    AddInput("input1", "6", "");
    std::string problem;
    EXPECT_TRUE(HasBuzzer(Places()));
    EXPECT_EQ(OpenBuzzer(Places(), problem), nullptr);
    EXPECT_EQ(problem, "it has no device node");
}

}  // namespace
}  // namespace orva
