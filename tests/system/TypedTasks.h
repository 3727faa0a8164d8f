// Tasks of every kind as the editor handles them: real server, real module, real store.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "tests/system/RunningServer.h"

namespace orva::test {

// An appliance with an English text for every key that the actions of tasks hold, the shares
// "photo", "video" and "web site" without recycle bins, and the packages "Notes" and "Wiki".
class TypedTasksTest : public testing::Test {
  protected:
    TypedTasksTest();

    // The answer to a method of the task scheduler's API.
    HttpAnswer Call(const std::string& method, const std::string& body) const;
    // Its body; fails the test unless the status is 200.
    std::string Body(const std::string& method, const std::string& body) const;

    // Stores tasks as the task tool reads them.
    void Import(const std::string& tasks) const;
    // All that is stored, as the task tool writes it, compact.
    std::string Records() const;

    // Writes or replaces the description of an installed package.
    void Install(const std::string& id, const std::string& description) const;

    RunningServer server;
};

// The JSON text without white space between its tokens, members in ascending order.
std::string Compact(const std::string& json);

// The answer of a method that succeeded with this data, which may be laid out over several lines.
std::string Success(const std::string& data);

// The answer of a method that failed; `details` as Success takes data.
std::string Failure(int code, const std::string& details);

}  // namespace orva::test
