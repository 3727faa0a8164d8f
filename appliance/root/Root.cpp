#include "appliance/root/Root.h"

#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <system_error>

namespace orva {
namespace {

std::string Normalise(const std::string& directory) {
    std::error_code error;
    std::filesystem::path path = std::filesystem::absolute(directory, error);
    if (error) {
        path = directory;
    }
    std::string text = path.lexically_normal().string();
    while (text.size() > 1 && text.back() == '/') {
        text.pop_back();
    }
    return text;
}

struct State {
    std::mutex mutex;
    std::string root;

    State() {
        const char* fromEnvironment = std::getenv("ORVA_ROOT");
        const bool given = fromEnvironment != nullptr && *fromEnvironment != '\0';
        root = Normalise(given ? fromEnvironment : "/");
    }
};

State& TheState() {
    static State state;
    return state;
}

}  // namespace

std::string Root() {
    State& state = TheState();
    const std::lock_guard lock(state.mutex);
    return state.root;
}

void SetRoot(const std::string& directory) {
    State& state = TheState();
    const std::lock_guard lock(state.mutex);
    state.root = Normalise(directory);
    ::setenv("ORVA_ROOT", state.root.c_str(), 1);
}

std::string RootProblem() {
    const std::string root = Root();
    std::error_code error;
    const bool isDirectory = std::filesystem::is_directory(root, error);
    if (isDirectory) {
        return {};
    }
    return "the root " + root + ": " +
           (error ? error : std::make_error_code(std::errc::not_a_directory)).message();
}

std::string ResolvePath(std::string_view path) {
    std::string resolved = Root();
    if (resolved == "/") {
        resolved.clear();
    }
    resolved += path;
    return resolved;
}

}  // namespace orva
