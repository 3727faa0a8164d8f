#pragma once

#include <benchmark/benchmark.h>

#include <map>
#include <string>
#include <vector>

namespace orva {

// Remembers each benchmark's median and prints those that have a floor beside it: the row of the
// same name with "_floor" at its end, which measures what the other cannot do without.
class FloorReporter : public benchmark::ConsoleReporter {
  public:
    FloorReporter() : ConsoleReporter(OO_Tabular) {}

    void ReportRuns(const std::vector<Run>& runs) override;

    void PrintRatios() const;

  private:
    std::map<std::string, double> times;
};

// Runs the benchmarks that the command line chooses and prints both tables.
int RunBenchmarks(int argc, char** argv);

}  // namespace orva
