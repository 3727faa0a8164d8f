#include "appliance/store/Snapshot.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace orva {
namespace {

constexpr std::array<std::pair<std::string_view, SortKey>, kSortKeys> kKeyNames = {{
    {"state", SortKey::kState},
    {"id", SortKey::kId},
    {"app name", SortKey::kAppName},
    {"name", SortKey::kName},
    {"action", SortKey::kAction},
    {"next trigger time", SortKey::kNextStart},
}};

// Sorts by the value that `valueOf` takes from an index. Values are taken once and lie side by side
// while they are compared. Indices break ties, so that the sort is stable without its cost.
template <class ValueOf>
std::vector<std::uint32_t> SortBy(std::size_t count, bool ascending, ValueOf valueOf) {
    using Value = decltype(valueOf(0U));
    std::vector<std::pair<Value, std::uint32_t>> items;
    items.reserve(count);
    for (std::uint32_t index = 0; index < count; ++index) {
        items.emplace_back(valueOf(index), index);
    }
    if (ascending) {
        std::sort(items.begin(), items.end());
    } else {
        std::sort(items.begin(), items.end(), [](const auto& left, const auto& right) {
            return left.first != right.first ? right.first < left.first
                                             : left.second < right.second;
        });
    }
    std::vector<std::uint32_t> indices;
    indices.reserve(count);
    for (const auto& item : items) {
        indices.push_back(item.second);
    }
    return indices;
}

}  // namespace

std::optional<SortKey> ParseSortKey(std::string_view text) {
    for (const auto& [name, key] : kKeyNames) {
        if (name == text) {
            return key;
        }
    }
    return std::nullopt;
}

std::vector<std::uint32_t> SortedIndices(std::size_t count, SortKey key, bool ascending,
                                         const std::function<SortItem(std::uint32_t)>& item) {
    using Index = std::uint32_t;
    switch (key) {
        case SortKey::kState:
            return SortBy(count, ascending, [&](Index at) { return item(at).task->Has(kEnabled); });
        case SortKey::kAppName:
            return SortBy(count, ascending,
                          [&](Index at) { return std::string_view(item(at).task->appName); });
        case SortKey::kName:
            return SortBy(count, ascending,
                          [&](Index at) { return std::string_view(item(at).task->name); });
        case SortKey::kAction:
            return SortBy(count, ascending,
                          [&](Index at) { return std::string_view(item(at).task->action); });
        case SortKey::kNextStart:
            return SortBy(count, ascending, [&](Index at) {
                const StartSecond start = item(at).nextStart;
                // kNoStart is the latest of all; descending it has to become the earliest.
                return start == kNoStart && !ascending ? kUnknownStart : start;
            });
        case SortKey::kId:
            break;
    }
    return SortBy(count, ascending, [&](Index at) { return item(at).task->id; });
}

SortOrder::SortOrder(std::vector<std::uint32_t> indices) : order(std::move(indices)) {
    rankOf.resize(order.size());
    for (std::uint32_t rank = 0; rank < order.size(); ++rank) {
        rankOf[order[rank]] = rank;
    }
}

Snapshot::Snapshot(std::vector<SharedTask> allTasks, const absl::TimeZone& zoneToUse,
                   absl::Time now, std::vector<DamagedTask> damagedTasks)
    : tasks(std::move(allTasks)),
      damaged(std::move(damagedTasks)),
      zone(zoneToUse),
      computedAt(now) {
    flags.reserve(tasks.size());
    nextStarts.reserve(tasks.size());
    for (const SharedTask& task : tasks) {
        flags.push_back(task->flags);
        nextStarts.push_back(ComputeNextStart(*task, zone, now));
        earliestStart = std::min(earliestStart, nextStarts.back());
    }
}

std::optional<std::size_t> Snapshot::Find(int id) const {
    const auto found =
        std::lower_bound(tasks.begin(), tasks.end(), id,
                         [](const SharedTask& task, int wanted) { return task->id < wanted; });
    if (found == tasks.end() || (*found)->id != id) {
        return std::nullopt;
    }
    return static_cast<std::size_t>(found - tasks.begin());
}

bool Snapshot::HoldsFor(const absl::TimeZone& zoneNow, absl::Time now) const {
    return zoneNow == zone && now >= computedAt &&
           (earliestStart == kNoStart || now < absl::FromUnixSeconds(earliestStart));
}

const SortOrder& Snapshot::Order(SortKey key, bool ascending) const {
    LazyOrder& lazy = orders.at(static_cast<std::size_t>(key) * 2 + (ascending ? 1 : 0));
    std::call_once(lazy.once, [&] {
        lazy.order.emplace(SortedIndices(tasks.size(), key, ascending, [this](std::uint32_t index) {
            return SortItem{tasks[index].get(), nextStarts[index]};
        }));
    });
    return *lazy.order;
}

}  // namespace orva
