// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/presentation/EventLoopWatch.h"
#include "benchmarks/presentation/FirstFrame.h"
#include "benchmarks/presentation/OrdinaryFiles.h"
#include "benchmarks/presentation/Process.h"

#include <benchmark/benchmark.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

/// The program on a healthy virtual device without a sound card beside a minimal Qt window, both in the same run: start
/// to the first complete frame, resident memory, processor time and wake-ups of the running programs, and how long
/// their first threads stay away from the event loop. The ratios are the program's figure over the minimal window's;
/// `wakeups_to_implied` is over what the program's own intervals imply.
///
/// A wake-up is counted whenever a thread of the program gave the processor up. Most of them are waits for the virtual
/// device's answers to reads of files, which the device's kernel gives at once; `runningOnOrdinaryFiles` leaves all but
/// the clock's out.
namespace
{

using namespace std::chrono_literals;
using Benchmarks::Process;
using Clock = std::chrono::steady_clock;

constexpr const char* insideVariable = "VIRTUAL_DEVICE_CONTROL";
constexpr auto settling = 5s;
constexpr auto observation = 60s;
constexpr auto samplingInterval = 200us;

/// Five polls, the sound's check, the transmission's indicator, the ping, two reading threads' half-second waits.
constexpr double impliedWakeUpsPerSecond = 5 + 1 + 2 + 1.0 / 3 + 2 * 2;

std::filesystem::path buildFolder()
{
    return std::filesystem::read_symlink("/proc/self/exe").parent_path().parent_path();
}

const std::string program = buildFolder() / "presentation/immunityrig";
const std::string minimalWindow = buildFolder() / "benchmarks/MinimalWindow";

double secondsToFirstFrame(const std::string& path, benchmark::State& state)
{
    static int port = 5950;
    ++port;
    const auto start = Clock::now();
    const Process process(path, "vnc:size=240x320:port=" + std::to_string(port));
    if (!Benchmarks::waitForFirstFrame(port))
        state.SkipWithError("no complete frame");
    return std::chrono::duration<double>(Clock::now() - start).count();
}

double median(std::vector<double> values)
{
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

/// The two take turns, and their medians are compared: a start is so short that one which the machine holds up would
/// count for several.
void startToFirstFrame(benchmark::State& state)
{
    std::vector<double> minimalSeconds;
    std::vector<double> programSeconds;
    for ([[maybe_unused]] auto iteration : state) {
        minimalSeconds.push_back(secondsToFirstFrame(minimalWindow, state));
        programSeconds.push_back(secondsToFirstFrame(program, state));
        state.SetIterationTime(programSeconds.back());
    }
    state.counters["minimal_ms"] = 1000 * median(minimalSeconds);
    state.counters["program_ms"] = 1000 * median(programSeconds);
    state.counters["start_ratio"] = median(programSeconds) / median(minimalSeconds);
}

struct Difference
{
    double cpuSeconds;
    double wakeUps;
    double residentKilobytes;
};

Difference difference(const Benchmarks::Usage& before, const Benchmarks::Usage& after)
{
    return {std::chrono::duration<double>(after.cpu - before.cpu).count(),
            static_cast<double>(after.wakeUps - before.wakeUps), static_cast<double>(after.residentKilobytes)};
}

void running(benchmark::State& state)
{
    for ([[maybe_unused]] auto iteration : state) {
        const Process minimal(minimalWindow, "offscreen");
        const Process measured(program, "offscreen");
        std::this_thread::sleep_for(settling);
        const auto minimalBefore = minimal.usage();
        const auto measuredBefore = measured.usage();
        std::this_thread::sleep_for(observation);
        const auto baseline = difference(minimalBefore, minimal.usage());
        const auto used = difference(measuredBefore, measured.usage());
        if (!minimal.isRunning() || !measured.isRunning())
            state.SkipWithError("a program ended");
        constexpr double seconds = std::chrono::duration<double>(observation).count();
        state.SetIterationTime(seconds);
        state.counters["cpu_ms_a_minute"] = 1000 * used.cpuSeconds;
        state.counters["cpu_ratio"] = used.cpuSeconds / baseline.cpuSeconds;
        state.counters["memory_MiB"] = used.residentKilobytes / 1024;
        state.counters["memory_ratio"] = used.residentKilobytes / baseline.residentKilobytes;
        state.counters["wakeups_a_second"] = used.wakeUps / seconds;
        state.counters["minimal_wakeups_a_second"] = baseline.wakeUps / seconds;
        state.counters["wakeups_to_implied"] = used.wakeUps / seconds / impliedWakeUpsPerSecond;
    }
}

/// "away" is the time between two waits in the event loop, in which a key or a repaint has to wait.
void awayFromEventLoop(benchmark::State& state)
{
    for ([[maybe_unused]] auto iteration : state) {
        const Process minimal(minimalWindow, "offscreen");
        const Process measured(program, "offscreen");
        std::this_thread::sleep_for(settling);
        Benchmarks::EventLoopWatch baseline(minimal.id());
        Benchmarks::EventLoopWatch watch(measured.id());
        const auto start = Clock::now();
        while (Clock::now() - start < observation) {
            baseline.sample();
            watch.sample();
            std::this_thread::sleep_for(samplingInterval);
        }
        if (!minimal.isRunning() || !measured.isRunning() || watch.stretches() == 0)
            state.SkipWithError("a program ended, or was never seen away");
        state.SetIterationTime(std::chrono::duration<double>(Clock::now() - start).count());
        state.counters["stretches"] = static_cast<double>(watch.stretches());
        state.counters["away_p99_ms"] = watch.quantile(0.99).count();
        state.counters["away_longest_ms"] = watch.longest().count();
        state.counters["minimal_p99_ms"] = baseline.quantile(0.99).count();
        state.counters["minimal_longest_ms"] = baseline.longest().count();
    }
}

/// Comes last: what it changes stays.
void runningOnOrdinaryFiles(benchmark::State& state)
{
    Benchmarks::useOrdinaryFiles();
    running(state);
}

BENCHMARK(startToFirstFrame)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(41);
BENCHMARK(running)->UseManualTime()->Unit(benchmark::kSecond)->Iterations(1);
BENCHMARK(awayFromEventLoop)->UseManualTime()->Unit(benchmark::kSecond)->Iterations(1);
BENCHMARK(runningOnOrdinaryFiles)->UseManualTime()->Unit(benchmark::kSecond)->Iterations(1);

/// Starts itself again in the sandbox of a virtual device, where the program finds its devices.
void enterDevice(char** argv)
{
    const std::string device = buildFolder() / "virtual-device/virtual-device";
    const std::string self = std::filesystem::read_symlink("/proc/self/exe");
    std::vector<const char*> arguments{device.c_str(), "exec", "--set", "audio.presence=missing", "--", self.c_str()};
    for (char** argument = argv + 1; *argument != nullptr; ++argument)
        arguments.push_back(*argument);
    arguments.push_back(nullptr);
    ::execv(device.c_str(), const_cast<char* const*>(arguments.data()));
    std::perror(device.c_str());
    std::exit(EXIT_FAILURE);
}

} // namespace

int main(int argc, char** argv)
{
    if (std::getenv(insideVariable) == nullptr)
        enterDevice(argv);
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return EXIT_FAILURE;
    benchmark::RunSpecifiedBenchmarks();
    return EXIT_SUCCESS;
}
