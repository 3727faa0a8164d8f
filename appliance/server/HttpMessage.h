#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace orva {

struct HttpRequest {
    std::string method;
    // Percent-decoded, without the query; holds no NUL.
    std::string path;
    // The query's names and values, decoded, in the order in which they came.
    std::vector<std::pair<std::string, std::string>> query;
    // Field names as they came; both views live until the answer has been made.
    std::vector<std::pair<std::string_view, std::string_view>> headers;
    // Empty while the request is only being admitted.
    std::string body;

    // The first field of that name, in any case; nothing when there is none.
    std::optional<std::string_view> Header(std::string_view name) const;
    std::size_t CountHeaders(std::string_view name) const;
    std::optional<std::string_view> Query(std::string_view name) const;
};

struct HttpResponse {
    int status = 200;
    std::vector<std::pair<std::string, std::string>> headers;
    std::string body;
};

// Whether two ASCII texts are the same but for the case of their letters.
bool EqualIgnoringCase(std::string_view a, std::string_view b);

// Splits and decodes a request target ("/webapi?lang=de", or the same after "http://host") into
// path and query. False when it is neither, when an escape in it is broken, or when it holds a NUL.
bool ParseTarget(std::string_view target, HttpRequest& request);

}  // namespace orva
