// Requests and answers as the tests of the server's parts write them.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "appliance/server/BootTime.h"
#include "appliance/server/HttpMessage.h"

namespace orva::test {

inline constexpr char kToken[] = "0123456789abcdef0123456789abcdef0123456789abcdef0123456789abcdef";

// The texts of `headers` outlive the request.
inline HttpRequest MakeRequest(
    const std::string& method, const std::string& target,
    std::vector<std::pair<std::string_view, std::string_view>> headers = {}) {
    HttpRequest request;
    EXPECT_TRUE(ParseTarget(target, request));
    request.method = method;
    request.headers = std::move(headers);
    return request;
}

inline PeerAddress Peer(std::uint8_t last) {
    return {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xFF, 0xFF, 192, 0, 2, last};
}

inline std::string HeaderOf(const HttpResponse& response, const std::string& name) {
    for (const auto& [field, value] : response.headers) {
        if (field == name) {
            return value;
        }
    }
    return "(none)";
}

inline std::string ErrorBody(int code, const std::string& message) {
    return R"({"success":false,"error":{"code":)" + std::to_string(code) +
           R"(,"details":{"msg":")" + message + R"("}}})";
}

// A clock that stands still until it is told otherwise. Outlives what Read() is given to.
class TestClock {
  public:
    BootClock Read() {
        return [this] { return time; };
    }
    void Advance(std::chrono::milliseconds by) { time += by; }

  private:
    std::chrono::milliseconds time{1'000'000};
};

}  // namespace orva::test
