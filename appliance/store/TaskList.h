#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <vector>

#include "appliance/store/Snapshot.h"
#include "appliance/store/TaskRecord.h"

namespace orva {

// A list of task records: the tasks of a snapshot that a filter chose, in some order. Records are
// made when somebody arrives at them: who shows one page of a long list pays for a page of records.
//
// Belongs to one thread at a time.
class TaskList {
  public:
    using Record = _tag_orva_sched_task_;
    using Filter = bool (*)(Record*);

    // All tasks when `filter` is null, by id.
    TaskList(std::shared_ptr<const Snapshot> snapshotToShow, Filter filter);
    TaskList(const TaskList&) = delete;
    TaskList& operator=(const TaskList&) = delete;

    std::size_t Count() const { return count; }
    const Snapshot& Tasks() const { return *snapshot; }

    // Null when the list is empty.
    Record* First();
    // Null after the last.
    Record* After(const Record& record);
    void Sort(SortKey key, bool ascending);

    // A record no longer shows what the snapshot holds.
    void NoteWritten() { written = true; }

  private:
    bool IsChosen(std::uint32_t index) const {
        return chosen.empty() || (chosen[index / kBits] >> (index % kBits) & 1U) != 0;
    }
    void Filtered(Filter filter);
    void KeepWritten(std::uint32_t index, const Record& probe);
    // The first chosen one from that place of the order on.
    Record* FromRank(std::size_t rank);
    Record* RecordAt(std::uint32_t index);
    StartSecond NextStartOf(std::uint32_t index) const;

    static constexpr std::uint32_t kBits = 64;

    std::shared_ptr<const Snapshot> snapshot;
    std::size_t count = 0;
    // One bit a task; empty when all are chosen.
    std::vector<std::uint64_t> chosen;
    // One more than the record's place in `records`; 0 for a task whose record was not made yet.
    std::vector<std::uint32_t> placeOf;
    // A deque: records in use must not move.
    std::deque<Record> records;
    // By id when null. The snapshot's, or the list's own once a record was written to.
    const SortOrder* order = nullptr;
    std::optional<SortOrder> ownOrder;
    bool written = false;
};

}  // namespace orva
