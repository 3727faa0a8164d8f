#include "appliance/webapi/ModuleLoader.h"

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <syslog.h>

#include <filesystem>
#include <string>
#include <vector>

#include "appliance/webapi/ApiAnswer.h"
#include "tests/system/Process.h"

namespace {

using orva::ApiCatalogue;
using orva::ModuleLoader;
using testing::HasSubstr;

class ModuleLoaderTest : public testing::Test {
  protected:
    ModuleLoaderTest() { ::openlog("test", LOG_PERROR, LOG_DAEMON); }
    ~ModuleLoaderTest() override { ::closelog(); }

    std::string Directory() const { return sandbox.Path().string(); }

    void Install(const std::string& module, const std::string& name) const {
        std::filesystem::copy_file(ORVA_TEST_MODULES "/" + module + ".so", sandbox.Path() / name);
    }

    // Loads the directory's modules; `log` then holds what was logged meanwhile.
    ModuleLoader Load() {
        testing::internal::CaptureStderr();
        ModuleLoader loader(Directory());
        log = testing::internal::GetCapturedStderr();
        return loader;
    }

    orva::test::Sandbox sandbox;
    std::string log;
};

bool HasMethod(const ModuleLoader& loader, const std::string& api, int version,
               const std::string& method) {
    return loader.Catalogue().Lookup(api, version, method).found == ApiCatalogue::Found::kMethod;
}

TEST_F(ModuleLoaderTest, LoadsTheModulesOfADirectory) {
    Install("echo", "echo.so");
    const ModuleLoader loader = Load();
    EXPECT_TRUE(HasMethod(loader, "Test.Echo", 1, "echo"));
    EXPECT_TRUE(HasMethod(loader, "Test.Echo", 2, "large"));
    EXPECT_EQ(log, "");
}

TEST_F(ModuleLoaderTest, FindsNothingInAnEmptyDirectory) {
    EXPECT_TRUE(Load().Catalogue().Describe().empty());
    EXPECT_EQ(log, "");
}

TEST_F(ModuleLoaderTest, SaysWhenTheDirectoryCannotBeRead) {
    testing::internal::CaptureStderr();
    const ModuleLoader loader("/nowhere/at/all");
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "test: cannot read the modules directory /nowhere/at/all: "
              "No such file or directory\n");
    EXPECT_TRUE(loader.Catalogue().Describe().empty());
}

TEST_F(ModuleLoaderTest, PassesOverFilesThatAreNoModulesByName) {
    sandbox.Write("README", "hello");
    Install("echo", "echo.so.old");
    EXPECT_TRUE(Load().Catalogue().Describe().empty());
    EXPECT_EQ(log, "");
}

TEST_F(ModuleLoaderTest, PassesOverThePlatformOfAnotherAppliance) {
    sandbox.Write("liborva.so", "another version");
    Install("echo", "echo.so");
    EXPECT_TRUE(HasMethod(Load(), "Test.Echo", 1, "echo"));
    EXPECT_EQ(log, "");
}

TEST_F(ModuleLoaderTest, PassesOverThePlatformsOwnLibrary) {
    Dl_info info{};
    ASSERT_NE(::dladdr(reinterpret_cast<const void*>(&orva::MakeErrorAnswer), &info), 0);
    std::filesystem::create_symlink(info.dli_fname, sandbox.Path() / "liborva.so");
    EXPECT_TRUE(Load().Catalogue().Describe().empty());
    EXPECT_EQ(log, "");
}

struct Fault {
    std::string module;
    std::string reason;
};

class FaultyModuleTest : public ModuleLoaderTest, public testing::WithParamInterface<Fault> {};

TEST_P(FaultyModuleTest, IsLeftOutAsAWholeWithOneLogLine) {
    Install(GetParam().module, "a_faulty.so");
    Install("echo", "b_echo.so");
    const ModuleLoader loader = Load();
    EXPECT_EQ(log, "test: module " + Directory() +
                       "/a_faulty.so is left out: " + GetParam().reason + "\n");
    EXPECT_FALSE(HasMethod(loader, "Test.Malformed", 1, "good"));
    EXPECT_TRUE(HasMethod(loader, "Test.Echo", 1, "echo"));
}

INSTANTIATE_TEST_SUITE_P(
    ModuleLoaderTest, FaultyModuleTest,
    testing::Values(Fault{"no_function", "it has no GetAPITable"},
                    Fault{"null_table", "its method table is null"},
                    Fault{"endless", "its method table has no end"},
                    Fault{"null_method", "row 2 of its method table is malformed"},
                    Fault{"null_function", "row 2 of its method table is malformed"},
                    Fault{"empty_api", "row 2 of its method table is malformed"},
                    Fault{"empty_method", "row 2 of its method table is malformed"},
                    Fault{"version_zero", "row 2 of its method table is malformed"},
                    Fault{"repeated", "another row has Test.Malformed 1 good already"}),
    [](const testing::TestParamInfo<Fault>& fault) { return fault.param.module; });

TEST_F(ModuleLoaderTest, LetsTheFirstNameInByteOrderWin) {
    Install("echo", "b.so");
    Install("taken", "B.so");
    const ModuleLoader loader = Load();
    EXPECT_TRUE(HasMethod(loader, "Test.Malformed", 1, "good"));
    EXPECT_FALSE(HasMethod(loader, "Test.Echo", 2, "large"));
    EXPECT_EQ(log, "test: module " + Directory() +
                       "/b.so is left out: another module has Test.Echo 1 already\n");
}

TEST_F(ModuleLoaderTest, LetsNoModuleAddMethodsToAnApiOfAnEarlierOne) {
    Install("echo", "a.so");
    Install("intruding", "b.so");
    const ModuleLoader loader = Load();
    EXPECT_TRUE(HasMethod(loader, "Test.Echo", 1, "echo"));
    EXPECT_FALSE(HasMethod(loader, "Test.Echo", 1, "more"));
    EXPECT_FALSE(HasMethod(loader, "Test.Malformed", 1, "good"));
    EXPECT_EQ(log, "test: module " + Directory() +
                       "/b.so is left out: another module has Test.Echo 1 already\n");
}

TEST_F(ModuleLoaderTest, LeavesOutWhatIsNoLibrary) {
    sandbox.Write("text.so", "this is text");
    EXPECT_TRUE(Load().Catalogue().Describe().empty());
    EXPECT_THAT(log, HasSubstr("text.so is left out: "));
}

TEST_F(ModuleLoaderTest, LeavesOutWhatIsNoFile) {
    std::filesystem::create_directory(sandbox.Path() / "directory.so");
    std::filesystem::create_symlink("/nowhere", sandbox.Path() / "link.so");
    Load();
    EXPECT_THAT(log, HasSubstr("directory.so is left out: it is no file\n"));
    EXPECT_THAT(log, HasSubstr("link.so is left out: it is no file\n"));
}

TEST_F(ModuleLoaderTest, LeavesOutAModuleThatAnybodyMayWrite) {
    Install("echo", "echo.so");
    std::filesystem::permissions(sandbox.Path() / "echo.so", std::filesystem::perms::others_write,
                                 std::filesystem::perm_options::add);
    EXPECT_TRUE(Load().Catalogue().Describe().empty());
    EXPECT_THAT(log, HasSubstr("echo.so is left out: anybody may write it\n"));
}

}  // namespace
