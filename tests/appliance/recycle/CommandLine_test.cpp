#include "appliance/recycle/CommandLine.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

ParsedCommandLine Parse(const std::vector<const char*>& arguments) {
    return ParseCommandLine(arguments);
}

RecycleCommand Good(const std::vector<const char*>& arguments) {
    const ParsedCommandLine parsed = Parse(arguments);
    EXPECT_TRUE(parsed.command.has_value()) << parsed.error;
    EXPECT_EQ(parsed.error, "");
    return parsed.command.value_or(RecycleCommand());
}

std::string ErrorOf(const std::vector<const char*>& arguments) {
    const ParsedCommandLine parsed = Parse(arguments);
    EXPECT_FALSE(parsed.command.has_value());
    return parsed.error;
}

TEST(CommandLineTest, UnderstandsTheCommandLineOfATask) {
    const RecycleCommand command = Good({"--clean", "share1", "share2", "-t", "30",
                                         "-file_ext=doc.pdf", "-m", "104857600", "-l", "0"});
    EXPECT_EQ(command.action, RecycleAction::kClean);
    EXPECT_THAT(command.shares, ElementsAre("share1", "share2"));
    EXPECT_EQ(command.rules.days, 30U);
    EXPECT_EQ(command.rules.sizeLimit, std::nullopt);
    EXPECT_THAT(command.rules.keepExtensions, ElementsAre("doc", "pdf"));
    EXPECT_EQ(command.rules.keepLarger, 104857600U);
    EXPECT_EQ(command.rules.keepSmaller, 0U);
    EXPECT_FALSE(command.preview);
}

TEST(CommandLineTest, TakesSharesAfterTheSwitches) {
    const RecycleCommand command = Good({"-s", "5", "--clean", "-o", "2", "a b", "--", "t"});
    EXPECT_EQ(command.rules.sizeLimit, 5U);
    EXPECT_EQ(command.rules.order, SizeOrder::kLargestFirst);
    EXPECT_THAT(command.shares, ElementsAre("a b", "t"));
}

TEST(CommandLineTest, TakesAnEmptyNameForANameAndNotForAllShares) {
    EXPECT_THAT(Good({"--clean", ""}).shares, ElementsAre(""));
}

TEST(CommandLineTest, NamesEachShareOnce) {
    EXPECT_THAT(Good({"--enable", "a", "b", "a"}).shares, ElementsAre("a", "b"));
}

TEST(CommandLineTest, RemovesTheOldestFirstUnlessToldOtherwise) {
    EXPECT_EQ(Good({"--clean", "-s", "0"}).rules.order, SizeOrder::kOldestFirst);
    EXPECT_EQ(Good({"--clean", "-s", "0", "-o", "1"}).rules.order, SizeOrder::kOldestFirst);
}

TEST(CommandLineTest, RefusesADayCountThatIsNoPlainNumber) {
    EXPECT_EQ(ErrorOf({"--clean", "-t"}), "-t needs a number of days");
    EXPECT_EQ(ErrorOf({"--clean", "-t", ""}), "-t needs a number of days, not ''");
    EXPECT_EQ(ErrorOf({"--clean", "-t", "-m", "5"}), "-t needs a number of days, not '-m'");
    EXPECT_EQ(ErrorOf({"--clean", "-t", "-file_ext=doc"}),
              "-t needs a number of days, not '-file_ext=doc'");
    for (const char* text :
         {"7d", " 7", "7 ", "+7", "-7", "0x7", "7.0", "1e3", "\xd9\xa7", "18446744073709551616"}) {
        EXPECT_NE(ErrorOf({"--clean", "-t", text}), "") << text;
    }
}

TEST(CommandLineTest, TakesLongAndPaddedNumbers) {
    EXPECT_EQ(Good({"--clean", "-t", "18446744073709551615"}).rules.days, 18446744073709551615U);
    EXPECT_EQ(Good({"--clean", "-t", "007"}).rules.days, 7U);
}

TEST(CommandLineTest, ReadsSizesBeyondTwoGigabytesAsMeant) {
    EXPECT_EQ(Good({"--clean", "-s", "18446744071562067968"}).rules.sizeLimit, 2147483648U);
    EXPECT_EQ(Good({"--clean", "-m", "18446744073708503040"}).rules.keepLarger, 4293918720U);
    EXPECT_EQ(Good({"--clean", "-l", "18446744073709551615"}).rules.keepSmaller, 4294967295U);
    EXPECT_EQ(Good({"--clean", "-s", "18446744071562067967"}).rules.sizeLimit,
              18446744071562067967U);
    EXPECT_EQ(Good({"--clean", "-s", "4294967296"}).rules.sizeLimit, 4294967296U);
    EXPECT_EQ(ErrorOf({"--clean", "-s", "18446744073709551616"}),
              "-s needs a number of bytes, not '18446744073709551616'");
}

TEST(CommandLineTest, TakesExtensionsInAnyCaseAndForm) {
    EXPECT_THAT(Good({"--clean", "-file_ext=.Doc..PDF. tar .gz"}).rules.keepExtensions,
                ElementsAre("doc", "pdf", "tar", "gz"));
    EXPECT_EQ(ErrorOf({"--clean", "-file_ext="}), "-file_ext= names no extension");
    EXPECT_EQ(ErrorOf({"--clean", "-file_ext=. ."}), "-file_ext= names no extension");
    EXPECT_EQ(ErrorOf({"--clean", "-file_ext", "doc"}), "unknown switch '-file_ext'");
}

TEST(CommandLineTest, NeedsExactlyOneAction) {
    EXPECT_EQ(ErrorOf({}), "one of --enable, --disable and --clean is needed");
    EXPECT_EQ(ErrorOf({"photo"}), "one of --enable, --disable and --clean is needed");
    EXPECT_EQ(ErrorOf({"--enable", "--clean"}), "--clean cannot be combined with --enable");
    EXPECT_EQ(ErrorOf({"--clean", "--clean"}), "--clean is given twice");
}

TEST(CommandLineTest, RefusesSwitchesThatDoNotFitTogether) {
    EXPECT_EQ(ErrorOf({"--clean", "-t", "1", "-s", "1"}), "-t and -s cannot be combined");
    EXPECT_EQ(ErrorOf({"--clean", "-o", "1"}), "-o goes with -s only");
    EXPECT_EQ(ErrorOf({"--clean", "-s", "1", "-o", "3"}),
              "-o needs 1 (oldest first) or 2 (largest first)");
    EXPECT_EQ(ErrorOf({"--clean", "-t", "1", "-t", "2"}), "-t is given twice");
    EXPECT_EQ(ErrorOf({"--enable", "-t", "1"}), "-t goes with --clean only");
    EXPECT_EQ(ErrorOf({"--disable", "-file_ext=a"}), "-file_ext goes with --clean only");
    EXPECT_EQ(ErrorOf({"--enable", "--dry-run"}), "--dry-run goes with --clean only");
    EXPECT_EQ(ErrorOf({"--clean", "--at", "2027-01-31T12:00:00Z"}),
              "--at goes with --dry-run only");
    EXPECT_EQ(ErrorOf({"--clean", "--json"}), "--json goes with --dry-run only");
}

TEST(CommandLineTest, TakesTheRootAfterTheActionForAPreviewOnly) {
    EXPECT_EQ(Good({"--clean", "--root", "/srv/x", "--dry-run"}).root, "/srv/x");
    EXPECT_EQ(ErrorOf({"--clean", "--root", "/srv/x"}), "--root stands before --clean");
    EXPECT_EQ(ErrorOf({"--disable", "--root=/srv/x"}), "--root stands before --disable");
}

TEST(CommandLineTest, NeedsTheNameOfAShareAfterTheLastSwitchUnlessItOnlyLooks) {
    EXPECT_EQ(ErrorOf({"--enable", "--"}), "-- needs the name of a share");
    EXPECT_EQ(ErrorOf({"--clean", "photo", "--"}), "-- needs the name of a share");
    EXPECT_EQ(ErrorOf({"--clean", "--", "photo", "-t", "30"}),
              "no share's name begins with a dash");
    EXPECT_THAT(Good({"--clean", "--dry-run", "--"}).shares, IsEmpty());
    EXPECT_THAT(Good({"--clean", "--dry-run", "--", "-t"}).shares, ElementsAre("-t"));
}

// What follows the names in the command lines of tasks.
const std::vector<std::vector<const char*>> kRulesOfTasks = {
    {},
    {"-t", "30"},
    {"-s", "1048576", "-o", "1"},
    {"-file_ext=doc.pdf"},
    {"-t", "30", "-file_ext=doc.pdf", "-m", "1048576", "-l", "0"},
};

// Whether a change by this command line is one of nothing but the named shares, by all of `rules`.
bool StaysWithin(const std::vector<const char*>& arguments, const RecycleCommand& rules) {
    const ParsedCommandLine parsed = ParseCommandLine(arguments);
    if (!parsed.command || parsed.command->action == RecycleAction::kHelp ||
        parsed.command->preview) {
        return true;
    }
    const RecycleCommand& command = *parsed.command;
    return !command.shares.empty() && !command.root && command.rules.days == rules.rules.days &&
           command.rules.sizeLimit == rules.rules.sizeLimit &&
           command.rules.keepExtensions == rules.rules.keepExtensions &&
           command.rules.keepLarger == rules.rules.keepLarger &&
           command.rules.keepSmaller == rules.rules.keepSmaller;
}

TEST(CommandLineTest, ANameThatReadsAsASwitchNeverWidensATasksSelectionOrLosesItsRules) {
    for (const char* action : {"--enable", "--disable", "--clean"}) {
        for (const std::vector<const char*>& rules : kRulesOfTasks) {
            if (action != std::string("--clean") && !rules.empty()) {
                continue;
            }
            std::vector<const char*> all = {action};
            all.insert(all.end(), rules.begin(), rules.end());
            const RecycleCommand meant = Good(all);
            for (const char* name :
                 {"--",          "--json", "--dry-run", "--at",      "--root",    "--root=",
                  "--root=/",    "--help", "--enable",  "--disable", "--clean",   "-t",
                  "-s",          "-o",     "-m",        "-l",        "-file_ext", "-file_ext=",
                  "-file_ext=.", "-",      "-x",        "--unknown", ""}) {
                for (const std::vector<const char*>& names : {std::vector<const char*>{name},
                                                              {name, "photo"},
                                                              {"photo", name},
                                                              {name, name}}) {
                    std::vector<const char*> arguments = {action};
                    arguments.insert(arguments.end(), names.begin(), names.end());
                    arguments.insert(arguments.end(), rules.begin(), rules.end());
                    EXPECT_TRUE(StaysWithin(arguments, meant)) << testing::PrintToString(arguments);
                }
            }
        }
    }
}

TEST(CommandLineTest, ANameThatReadsAsAWholeRuleNeverWidensASelectionThatHoldsAShare) {
    for (const std::vector<const char*>& rule : {std::vector<const char*>{"-t", "30"},
                                                 {"-s", "0"},
                                                 {"-m", "1"},
                                                 {"-l", "1"},
                                                 {"-file_ext=doc"},
                                                 {"-s", "0", "-o", "2"}}) {
        std::vector<const char*> arguments = {"--clean", "photo"};
        arguments.insert(arguments.end(), rule.begin(), rule.end());
        EXPECT_THAT(Good(arguments).shares, ElementsAre("photo"));
    }
}

TEST(CommandLineTest, RefusesWhatItDoesNotKnow) {
    for (const char* text : {"-x", "-t30", "--t", "-T", "-", "--dry", "--root-x", "-file_extx=a"}) {
        EXPECT_EQ(ErrorOf({"--clean", text}), "unknown switch '" + std::string(text) + "'");
    }
}

TEST(CommandLineTest, ReadsTheInstantOfAPreview) {
    EXPECT_EQ(Good({"--clean", "--dry-run", "--at", "2027-01-31T12:00:01Z"}).at,
              1801396801 * kNanosecondsPerSecond);
    for (const char* text : {"", "2027-01-31", "2027-01-31T12:00:01", "2027-02-30T00:00:00Z",
                             "2027-01-31T12:00:01+01:00", "2027-01-31 12:00:01Z", "now"}) {
        EXPECT_EQ(ErrorOf({"--clean", "--dry-run", "--at", text}),
                  "--at needs an instant in UTC, such as 2027-01-31T12:00:00Z");
    }
}

TEST(CommandLineTest, TakesTheRootInBothForms) {
    EXPECT_EQ(Good({"--root", "/srv/x", "--clean"}).root, "/srv/x");
    EXPECT_EQ(Good({"--root=/srv/x", "--enable"}).root, "/srv/x");
    EXPECT_EQ(ErrorOf({"--clean", "--root"}), "--root needs a directory");
    EXPECT_EQ(ErrorOf({"--clean", "--root="}), "--root needs a directory");
    EXPECT_EQ(ErrorOf({"--clean", "--root=/a", "--root", "/b"}), "--root is given twice");
}

TEST(CommandLineTest, HelpsWithoutAnAction) {
    EXPECT_EQ(Good({"--help"}).action, RecycleAction::kHelp);
    EXPECT_THAT(Good({"--clean", "--help"}).shares, IsEmpty());
}

}  // namespace
}  // namespace orva
