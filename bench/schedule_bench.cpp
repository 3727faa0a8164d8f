// What it costs to find when a task starts next.
#include <absl/time/time.h>
#include <benchmark/benchmark.h>

#include <stdexcept>

#include "appliance/schedule/StartTimes.h"

namespace {

using orva::Schedule;

absl::TimeZone Berlin() {
    absl::TimeZone zone;
    if (!absl::LoadTimeZone("Europe/Berlin", &zone)) {
        throw std::runtime_error("no time zone Europe/Berlin");
    }
    return zone;
}

// One call after the other from ever later instants of a year, a bit more than a day apart.
void Measure(benchmark::State& state, const Schedule& schedule) {
    constexpr int kSteps = 340;
    const absl::TimeZone zone = Berlin();
    const absl::Time first = absl::FromUnixSeconds(1767225600);
    int step = 0;
    for (auto _ : state) {
        const absl::Time after = first + step * absl::Minutes(1543);
        benchmark::DoNotOptimize(orva::FindNextStart(schedule, zone, after));
        step = (step + 1) % kSteps;
    }
}

void NextOfWeekly(benchmark::State& state) {
    Schedule schedule;
    schedule.weekDays = 0b0101010;
    schedule.firstMinute = 150;
    Measure(state, schedule);
}
BENCHMARK(NextOfWeekly);

void NextOfSeries(benchmark::State& state) {
    Schedule schedule;
    schedule.firstMinute = 60;
    schedule.intervalMinutes = 5;
    Measure(state, schedule);
}
BENCHMARK(NextOfSeries);

void NextOfMonthly(benchmark::State& state) {
    Schedule schedule;
    schedule.mode = Schedule::Mode::kDate;
    schedule.repeat = Schedule::Repeat::kMonthly;
    schedule.date = absl::CivilDay(2001, 1, 31);
    Measure(state, schedule);
}
BENCHMARK(NextOfMonthly);

void NextOfYearly(benchmark::State& state) {
    Schedule schedule;
    schedule.mode = Schedule::Mode::kDate;
    schedule.repeat = Schedule::Repeat::kYearly;
    schedule.date = absl::CivilDay(2004, 2, 29);
    Measure(state, schedule);
}
BENCHMARK(NextOfYearly);

// The dearest call: a start a minute on the day on which the clock goes back.
void NextOfSeriesAtClockChange(benchmark::State& state) {
    Schedule schedule;
    schedule.intervalMinutes = 1;
    const absl::TimeZone zone = Berlin();
    // Noon of 25 October 2026.
    const absl::Time after = absl::FromUnixSeconds(1792926000);
    for (auto _ : state) {
        benchmark::DoNotOptimize(orva::FindNextStart(schedule, zone, after));
    }
}
BENCHMARK(NextOfSeriesAtClockChange);

}  // namespace

BENCHMARK_MAIN();
