#include "tests/appliance/recycle/BinTest.h"

#include <unistd.h>

#include <ctime>
#include <filesystem>
#include <fstream>
#include <stdexcept>

BinTest::BinTest() { std::filesystem::create_directories(BinPath()); }

void BinTest::File(const std::string& name, std::size_t bytes) {
    const std::filesystem::path path = InBin(name);
    std::filesystem::create_directories(path.parent_path());
    std::ofstream(path, std::ios::binary) << std::string(bytes, 'x');
    // The clock of files ticks more slowly than files are made.
    while (ChangedTime(name) <= lastChanged) {
        ASSERT_EQ(::chmod(path.c_str(), 0644), 0);
    }
    lastChanged = ChangedTime(name);
}

void BinTest::Directory(const std::string& name) const {
    std::filesystem::create_directories(InBin(name));
}

orva::FileTime BinTest::ChangedTime(const std::string& name) const {
    struct stat status {};
    if (::lstat(InBin(name).c_str(), &status) != 0) {
        throw std::runtime_error("no file " + name);
    }
    return orva::ToFileTime(status.st_ctim.tv_sec,
                            static_cast<std::uint32_t>(status.st_ctim.tv_nsec));
}

std::set<std::string> BinTest::Contents() const {
    namespace fs = std::filesystem;
    std::set<std::string> contents;
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(BinPath())) {
        const std::string path = entry.path().string().substr(BinPath().size() + 1);
        const bool directory = entry.symlink_status().type() == fs::file_type::directory;
        contents.insert(directory ? path + "/" : path);
    }
    return contents;
}

orva::CleanTotals BinTest::Clean(const orva::CleanRules& rules, std::optional<orva::FileTime> now) {
    return Run(rules, now, false);
}

orva::CleanTotals BinTest::Preview(const orva::CleanRules& rules,
                                   std::optional<orva::FileTime> now) {
    return Run(rules, now, true);
}

orva::CleanTotals BinTest::Run(const orva::CleanRules& rules, std::optional<orva::FileTime> now,
                               bool preview) {
    timespec clock{};
    ::clock_gettime(CLOCK_REALTIME, &clock);
    const orva::CleanJudge judge(
        rules,
        now.value_or(orva::ToFileTime(clock.tv_sec, static_cast<std::uint32_t>(clock.tv_nsec))));
    report.emplace(preview);
    orva::LinkTimes links;
    orva::CleanRun run{judge, *report, links, preview};
    orva::BinOpening opening = orva::OpenAndLockBin(SharePath(), preview, [] {});
    if (!opening.bin) {
        throw std::runtime_error(opening.problem);
    }
    return orva::CleanBin(std::move(*opening.bin), run);
}
