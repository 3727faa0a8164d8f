#include "appliance/supervisor/Owner.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string_view>
#include <utility>

namespace orva {
namespace {

constexpr std::size_t kUsualEntry = 1024;
constexpr std::size_t kLargestEntry = 1024 * kUsualEntry;

constexpr const char* kPath = "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";
constexpr const char* kLanguage = "C.UTF-8";
constexpr const char* kShell = "/bin/sh";

// The zone's name where the machine has one, since not every program reads a path there.
std::string MachineTimeZone() {
    constexpr const char* kLink = "/etc/localtime";
    constexpr std::string_view kZones = "/zoneinfo/";
    if (const char* given = std::getenv("TZ"); given != nullptr && *given != '\0') {
        return given;
    }
    char target[4096];
    const ssize_t length = ::readlink(kLink, target, sizeof target);
    if (length > 0) {
        const std::string_view path(target, static_cast<std::size_t>(length));
        const std::size_t at = path.find(kZones);
        if (at != std::string_view::npos) {
            return std::string(path.substr(at + kZones.size()));
        }
    }
    return ::access(kLink, R_OK) == 0 ? std::string(":") + kLink : "UTC";
}

// Root of a user namespace may have to keep the groups that it came with.
bool CanSetGroups() {
    std::string answer;
    std::ifstream("/proc/self/setgroups") >> answer;
    return answer != "deny";
}

std::vector<gid_t> OwnGroups() {
    std::vector<gid_t> groups(static_cast<std::size_t>(std::max(0, ::getgroups(0, nullptr))));
    const int count = ::getgroups(static_cast<int>(groups.size()), groups.data());
    groups.resize(static_cast<std::size_t>(std::max(0, count)));
    return groups;
}

std::vector<gid_t> LoginGroups(const Owner& owner) {
    int count = 64;
    std::vector<gid_t> groups(static_cast<std::size_t>(count));
    while (::getgrouplist(owner.name.c_str(), owner.group, groups.data(), &count) < 0) {
        groups.resize(std::max(static_cast<std::size_t>(count), 2 * groups.size()));
        count = static_cast<int>(groups.size());
    }
    groups.resize(static_cast<std::size_t>(count));
    return groups;
}

}  // namespace

std::optional<Owner> FindOwner(const std::string& name, std::string& why) {
    std::vector<char> buffer(kUsualEntry);
    passwd entry{};
    passwd* found = nullptr;
    int error = 0;
    // The C interface would look for what stands before the NUL.
    if (!name.empty() && name.find('\0') == std::string::npos) {
        while ((error = ::getpwnam_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found)) ==
                   ERANGE &&
               buffer.size() < kLargestEntry) {
            buffer.resize(buffer.size() * 2);
        }
    }
    if (found == nullptr) {
        // Name services have several ways to say that there is none.
        const bool gone =
            error == 0 || error == ENOENT || error == ESRCH || error == EBADF || error == EPERM;
        why = gone ? "the owner is gone"
                   : std::string("the owner cannot be looked up: ") + std::strerror(error);
        return std::nullopt;
    }
    if (::geteuid() != 0 && ::geteuid() != found->pw_uid) {
        why = "not permitted";
        return std::nullopt;
    }
    return Owner{found->pw_name, found->pw_dir, found->pw_uid, found->pw_gid};
}

bool IsOwner(const Owner& owner) {
    if (::geteuid() != owner.user) {
        return false;
    }
    if (owner.user != 0 || !CanSetGroups()) {
        // Nobody but root could change the groups, and not everywhere.
        return true;
    }
    std::vector<gid_t> own = OwnGroups();
    std::vector<gid_t> login = LoginGroups(owner);
    std::sort(own.begin(), own.end());
    std::sort(login.begin(), login.end());
    return ::getegid() == owner.group && own == login;
}

std::vector<std::string> CleanEnvironment(
    const Owner& owner, const std::vector<std::pair<std::string, std::string>>& more) {
    std::vector<std::pair<std::string, std::string>> variables = {
        {"PATH", kPath},   {"HOME", owner.home}, {"USER", owner.name},     {"LOGNAME", owner.name},
        {"SHELL", kShell}, {"LANG", kLanguage},  {"TZ", MachineTimeZone()}};
    if (const char* root = std::getenv("ORVA_ROOT");
        root != nullptr && *root != '\0' && std::strcmp(root, "/") != 0) {
        variables.emplace_back("ORVA_ROOT", root);
    }
    for (const auto& [name, value] : more) {
        const auto same = std::find_if(
            variables.begin(), variables.end(),
            [&wanted = name](const auto& variable) { return variable.first == wanted; });
        if (same != variables.end()) {
            same->second = value;
        } else {
            variables.emplace_back(name, value);
        }
    }
    std::vector<std::string> environment;
    environment.reserve(variables.size());
    for (auto& [name, value] : variables) {
        name += '=';
        name += value;
        environment.push_back(std::move(name));
    }
    return environment;
}

}  // namespace orva
