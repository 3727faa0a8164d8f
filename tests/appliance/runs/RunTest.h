#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "appliance/runs/RunStore.h"
#include "tests/appliance/store/StoreTest.h"

// A test with a history of its own, filled as the scheduler fills it: row by row.
class RunTest : public StoreTest {
  protected:
    // Creates the database.
    RunTest();

    // Inserts a run with those columns ("task, state, ...") and values, and what every row has
    // where they do not say otherwise: task 1, reason 'hand', state 'ended', queued at 0. Yields
    // its id.
    std::int64_t AddRun(const std::string& columns = {}, const std::string& values = {}) const;

    // Runs a statement on the database, from outside.
    void Execute(const std::string& sql) const;

    static std::shared_ptr<orva::RunStore> Runs() { return orva::RunStore::Current(); }
};
