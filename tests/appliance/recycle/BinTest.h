#pragma once

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "appliance/recycle/BinCleaner.h"
#include "appliance/recycle/BinOpener.h"
#include "tests/appliance/util/Sandbox.h"

// Keeps what is reported: paths, each with its reason or action.
class RecordingReport final : public orva::CleanReport {
  public:
    explicit RecordingReport(bool isPreview) : CleanReport(stdout, stderr, isPreview) {}

    void BeginBin(const std::string&) override {}
    void EndBin(const orva::CleanTotals&) override {}
    void Goes(const orva::ReportedEntry& entry) override {
        EXPECT_TRUE(preview);
        goes.push_back(entry.path);
    }
    void Stays(const orva::ReportedEntry& entry, orva::KeepReason reason) override {
        stays.insert({entry.path, std::string(orva::KeepReasonWord(reason))});
    }
    void Failed(std::string_view path, std::string_view action, int error) override {
        failed.insert({std::string(path), std::string(action) + " " + std::to_string(error)});
    }
    void Problem(const std::string&, const std::string&) override {}
    void Note(const std::string&, const std::string&) override {}
    bool Finish() override { return true; }

    std::vector<std::string> goes;
    std::set<std::pair<std::string, std::string>> stays;
    std::set<std::pair<std::string, std::string>> failed;
};

// A share with a bin, and cleans of it at instants that the test chooses.
class BinTest : public Sandbox {
  protected:
    static constexpr orva::FileTime kDay = 86'400 * orva::kNanosecondsPerSecond;

    BinTest();

    std::string SharePath() const { return RootPath() + "/volume1/photo"; }
    std::string BinPath() const { return SharePath() + "/.recycle"; }
    std::string InBin(const std::string& name) const { return BinPath() + "/" + name; }

    // Makes a file of `bytes` bytes in the bin, with the directories above it. Its change time is
    // later than that of every file made before.
    void File(const std::string& name, std::size_t bytes = 0);
    void Directory(const std::string& name) const;

    orva::FileTime ChangedTime(const std::string& name) const;

    // Everything in the bin, directories with a slash at their end.
    std::set<std::string> Contents() const;

    // Cleans at `now` (the real time when it is absent); the report's events are kept in `report`.
    orva::CleanTotals Clean(const orva::CleanRules& rules,
                            std::optional<orva::FileTime> now = std::nullopt);
    orva::CleanTotals Preview(const orva::CleanRules& rules,
                              std::optional<orva::FileTime> now = std::nullopt);

    std::optional<RecordingReport> report;

  private:
    orva::CleanTotals Run(const orva::CleanRules& rules, std::optional<orva::FileTime> now,
                          bool preview);

    orva::FileTime lastChanged = 0;
};
