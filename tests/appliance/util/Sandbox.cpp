#include "tests/appliance/util/Sandbox.h"

#include <stdlib.h>
#include <syslog.h>

#include <array>
#include <cstdarg>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <mutex>
#include <stdexcept>
#include <utility>

#include "appliance/root/Root.h"

namespace {

std::mutex logMutex;
std::vector<std::string> logLines;

}  // namespace

// Takes the place of the C library's: the tests read what the appliance logs.
extern "C" void syslog(int /*priority*/, const char* format, ...) {
    std::array<char, 4096> line{};
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(line.data(), line.size(), format, arguments);
    va_end(arguments);
    const std::lock_guard lock(logMutex);
    logLines.emplace_back(line.data());
}

std::vector<std::string> TakeLog() {
    const std::lock_guard lock(logMutex);
    return std::exchange(logLines, {});
}

Sandbox::Sandbox() {
    std::string path = testing::TempDir() + "orva-test-XXXXXX";
    if (::mkdtemp(path.data()) == nullptr) {
        throw std::runtime_error("no temporary directory");
    }
    root = path;
    orva::SetRoot(root);
    TakeLog();
}

Sandbox::~Sandbox() {
    std::error_code error;
    std::filesystem::remove_all(root, error);
}

void Sandbox::Write(const std::string& path, const std::string& content) const {
    const std::filesystem::path file = root + path;
    std::filesystem::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << content;
}

void Sandbox::MakeDirectory(const std::string& path) const {
    std::filesystem::create_directories(root + path);
}

std::string Sandbox::Read(const std::string& path) const {
    std::ifstream file(root + path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}
