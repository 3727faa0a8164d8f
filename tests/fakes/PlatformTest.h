#pragma once

#include <gtest/gtest.h>

#include <string>

#include "platform/webapi.h"
#include "tests/fakes/RecordingPlatform.h"

namespace fakes {

// A test on a recording platform of its own; what the module did not free fails it.
class PlatformTest : public ::testing::Test {
  protected:
    void TearDown() override { EXPECT_EQ(platform.Leftovers(), ""); }

    RecordingPlatform platform;
};

// A request with the parameters of a JSON text, in the language "enu".
inline ORVA::APIRequest Request(const std::string& parameters) {
    return {Document(parameters), "enu"};
}

// What a method answered as one text: `success {"id":5}`, `error 4800 {"msg":"..."}` or `nothing`.
inline std::string Answer(const ORVA::APIResponse& response) {
    if (!response.IsSet()) {
        return "nothing";
    }
    const std::string document = Compact(response.GetDocument());
    return response.IsSuccess()
               ? "success " + document
               : "error " + std::to_string(response.GetErrorCode()) + " " + document;
}

}  // namespace fakes
