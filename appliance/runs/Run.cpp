#include "appliance/runs/Run.h"

#include <algorithm>

namespace orva {
namespace {

template <class Enum, std::size_t size>
std::optional<Enum> ParseText(const std::array<std::string_view, size>& texts,
                              std::string_view text) {
    const auto* const found = std::find(texts.begin(), texts.end(), text);
    if (found == texts.end()) {
        return std::nullopt;
    }
    return static_cast<Enum>(found - texts.begin());
}

}  // namespace

std::optional<RunReason> ParseRunReason(std::string_view text) {
    return ParseText<RunReason>(kRunReasonTexts, text);
}

std::optional<RunState> ParseRunState(std::string_view text) {
    return ParseText<RunState>(kRunStateTexts, text);
}

}  // namespace orva
