#include <gmock/gmock.h>

#include <array>
#include <cstdio>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

namespace {

using ::testing::UnorderedElementsAre;

struct PipeDeleter {
    void operator()(std::FILE* pipe) const { pclose(pipe); }
};

// What a shell command prints.
std::string Output(const std::string& command) {
    const std::unique_ptr<std::FILE, PipeDeleter> pipe(popen(command.c_str(), "r"));
    std::string output;
    std::array<char, 4096> buffer;
    while (std::size_t count = std::fread(buffer.data(), 1, buffer.size(), pipe.get())) {
        output.append(buffer.data(), count);
    }
    return output;
}

TEST(ModuleExportsTest, AreTheTableAndTheMethodsAndNothingElse) {
    std::istringstream lines(
        Output("nm -D --defined-only '" ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so'"));
    std::vector<std::string> symbols;
    std::string address;
    std::string type;
    std::string name;
    while (lines >> address >> type >> name) {
        symbols.push_back(type + " " + name);
    }
    // T: a function; R and D: data, which relocation moves to D.
    EXPECT_THAT(symbols,
                UnorderedElementsAre("T GetAPITable", "D gTable", "T TaskSchedulerList_v1",
                                     "T TaskSchedulerSetEnable_v1", "T TaskSchedulerDelete_v1",
                                     "T TaskSchedulerRun_v1", "T TaskSchedulerGet_v1",
                                     "T TaskSchedulerSet_v1", "T TaskSchedulerCreate_v1"));
}

}  // namespace
