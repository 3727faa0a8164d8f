#include "bench/FloorReporter.h"

#include <cstdio>

namespace orva {

void FloorReporter::ReportRuns(const std::vector<Run>& runs) {
    for (const Run& run : runs) {
        if (run.run_type == Run::RT_Iteration || run.aggregate_name == "median") {
            times[run.run_name.function_name] = run.GetAdjustedRealTime();
        }
    }
    ConsoleReporter::ReportRuns(runs);
}

void FloorReporter::PrintRatios() const {
    for (const auto& [name, time] : times) {
        const auto floor = times.find(name + "_floor");
        if (floor != times.end()) {
            std::printf("%-20s takes %.2f times its floor\n", name.c_str(), time / floor->second);
        }
    }
}

int RunBenchmarks(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    FloorReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    reporter.PrintRatios();
    return 0;
}

}  // namespace orva
