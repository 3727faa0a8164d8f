#include "appliance/store/TaskList.h"

#include <utility>

namespace orva {

TaskList::TaskList(std::shared_ptr<const Snapshot> snapshotToShow, Filter filter)
    : snapshot(std::move(snapshotToShow)), count(snapshot->Count()), placeOf(snapshot->Count()) {
    if (filter != nullptr) {
        Filtered(filter);
    }
}

void TaskList::Filtered(Filter filter) {
    const auto total = static_cast<std::uint32_t>(snapshot->Count());
    std::vector<std::uint64_t> bits((total + kBits - 1) / kBits);
    count = 0;
    for (std::uint32_t index = 0; index < total; ++index) {
        Record probe(*this, index, snapshot->Task(index), snapshot->Flags(index),
                     snapshot->NextStart(index));
        if (!filter(&probe)) {
            continue;
        }
        bits[index / kBits] |= std::uint64_t{1} << (index % kBits);
        ++count;
        if (&probe.Data() != &snapshot->Task(index)) {
            KeepWritten(index, probe);
        }
    }
    if (count < total) {
        chosen = std::move(bits);
    }
}

// The filter wrote to the record that it was shown; the list's record shows that.
void TaskList::KeepWritten(std::uint32_t index, const Record& probe) {
    RecordAt(index)->ShowSameAs(probe);
}

TaskList::Record* TaskList::First() { return FromRank(0); }

TaskList::Record* TaskList::After(const Record& record) {
    const std::uint32_t rank = order == nullptr ? record.Index() : order->rankOf[record.Index()];
    return FromRank(std::size_t{rank} + 1);
}

TaskList::Record* TaskList::FromRank(std::size_t rank) {
    for (; rank < snapshot->Count(); ++rank) {
        const std::uint32_t index =
            order == nullptr ? static_cast<std::uint32_t>(rank) : order->order[rank];
        if (IsChosen(index)) {
            return RecordAt(index);
        }
    }
    return nullptr;
}

TaskList::Record* TaskList::RecordAt(std::uint32_t index) {
    if (placeOf[index] == 0) {
        records.emplace_back(*this, index, snapshot->Task(index), snapshot->Flags(index),
                             snapshot->NextStart(index));
        placeOf[index] = static_cast<std::uint32_t>(records.size());
    }
    return &records[placeOf[index] - 1];
}

StartSecond TaskList::NextStartOf(std::uint32_t index) const {
    if (placeOf[index] == 0) {
        return snapshot->NextStart(index);
    }
    const Record& record = records[placeOf[index] - 1];
    return record.NextStart() != kUnknownStart
               ? record.NextStart()
               : ComputeNextStart(record.Data(), snapshot->Zone(), snapshot->ComputedAt());
}

void TaskList::Sort(SortKey key, bool ascending) {
    if (!written) {
        order = key == SortKey::kId && ascending ? nullptr : &snapshot->Order(key, ascending);
        return;
    }
    const auto item = [this](std::uint32_t index) {
        const TaskData& task =
            placeOf[index] == 0 ? snapshot->Task(index) : records[placeOf[index] - 1].Data();
        return SortItem{&task, NextStartOf(index)};
    };
    ownOrder.emplace(SortedIndices(snapshot->Count(), key, ascending, item));
    order = &*ownOrder;
}

}  // namespace orva
