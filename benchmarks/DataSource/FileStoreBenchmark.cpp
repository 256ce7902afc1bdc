// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileStore.h"

#include <QCoreApplication>
#include <QEventLoop>
#include <QTemporaryDir>

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <memory>

using DataSource::FileStore;

namespace
{

/// A directory of so many files of a few bytes, made once for all benchmarks.
class FullDirectory
{
public:
    explicit FullDirectory(int files)
    {
        const int directory = ::open(qPrintable(temporary.path()), O_DIRECTORY | O_PATH | O_CLOEXEC);
        for (int index = 0; index < files; ++index) {
            const QByteArray name = "recording " + QByteArray::number(index);
            const int file = ::openat(directory, name.constData(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600);
            if (file < 0 || ::write(file, name.constData(), static_cast<std::size_t>(name.size())) != name.size())
                qFatal("Cannot fill %s", qPrintable(temporary.path()));
            ::close(file);
        }
        ::close(directory);
    }

    [[nodiscard]] QString path() const { return temporary.path(); }

    static const FullDirectory& of(int files)
    {
        static const FullDirectory small(100);
        static const FullDirectory large(100'000);
        return files == 100 ? small : large;
    }

private:
    QTemporaryDir temporary;
};

constexpr int manyFiles = 100'000;

void scan(FileStore& store)
{
    QEventLoop loop;
    QObject::connect(&store, &FileStore::scanComplete, &loop, &QEventLoop::quit);
    store.rescan();
    loop.exec();
}

/// Of the whole directory: what every scan has to do. Returns the bytes in its files.
std::uintmax_t standardLibraryWalk()
{
    std::uintmax_t bytes = 0;
    for (const auto& entry : std::filesystem::directory_iterator(FullDirectory::of(manyFiles).path().toStdString()))
        bytes += entry.file_size();
    return bytes;
}

/// From the request to the report on the store's thread, in turns with the standard library's walk over the same files:
/// "of_walk" is the ratio of their times, at most 1.5.
void rescan(benchmark::State& state)
{
    using Clock = std::chrono::steady_clock;
    using Seconds = std::chrono::duration<double>;
    FileStore store(FullDirectory::of(manyFiles).path());
    std::uintmax_t bytes = standardLibraryWalk(); // the kernel knows the directory from here on
    Seconds walks{};
    Seconds scans{};
    for ([[maybe_unused]] auto iteration : state) {
        const auto start = Clock::now();
        bytes = standardLibraryWalk();
        const auto walked = Clock::now();
        scan(store);
        const Seconds scanned = Clock::now() - walked;
        walks += walked - start;
        scans += scanned;
        state.SetIterationTime(scanned.count());
    }
    if (store.count() != manyFiles || static_cast<std::uintmax_t>(store.bytesUsed()) != bytes)
        state.SkipWithError("the scan has missed something");
    state.counters["walk_ms"] = benchmark::Counter(1000 * walks.count(), benchmark::Counter::kAvgIterations);
    state.counters["of_walk"] = scans / walks;
}
BENCHMARK(rescan)->Unit(benchmark::kMillisecond)->UseManualTime();

/// A page of ten records after the other, from a position on: two listings in three pages, each as long as the
/// position.
void page(benchmark::State& state)
{
    FileStore store(FullDirectory::of(manyFiles).path());
    int position = static_cast<int>(state.range(0));
    benchmark::DoNotOptimize(store.fileAt(position));
    for ([[maybe_unused]] auto iteration : state) {
        for (int row = 0; row < 10; ++row)
            benchmark::DoNotOptimize(store.fileAt(++position));
    }
}
BENCHMARK(page)->Arg(0)->Arg(10'000)->Arg(90'000)->Unit(benchmark::kMicrosecond)->Iterations(150);

/// Each read is out of the cache's reach and lists the directory up to its position.
void farMiss(benchmark::State& state)
{
    FileStore store(FullDirectory::of(manyFiles).path());
    int step = 0;
    for ([[maybe_unused]] auto iteration : state)
        benchmark::DoNotOptimize(store.fileAt(10'000 + 100 * (step = 1 - step)));
}
BENCHMARK(farMiss)->Unit(benchmark::kMicrosecond);

void hit(benchmark::State& state)
{
    FileStore store(FullDirectory::of(manyFiles).path());
    for ([[maybe_unused]] auto iteration : state)
        benchmark::DoNotOptimize(store.fileAt(7));
}
BENCHMARK(hit);

/// "heap" is what a store keeps after a scan and some paging: the same for any number of files. The last round counts;
/// the first also pays for what the process makes once.
void memory(benchmark::State& state)
{
    const auto& directory = FullDirectory::of(static_cast<int>(state.range(0)));
    double heap = 0;
    for ([[maybe_unused]] auto iteration : state) {
        const auto before = ::mallinfo2().uordblks;
        const auto store = std::make_unique<FileStore>(directory.path());
        scan(*store);
        for (int index = 0; index < 100; ++index)
            benchmark::DoNotOptimize(store->fileAt(index));
        heap = static_cast<double>(::mallinfo2().uordblks) - static_cast<double>(before);
    }
    state.counters["heap"] = heap;
}
BENCHMARK(memory)->Arg(100)->Arg(manyFiles)->Unit(benchmark::kMillisecond)->Iterations(5);

} // namespace

int main(int argc, char* argv[])
{
    // One heap for all threads, so that "heap" also sees what the pool's threads keep.
    ::mallopt(M_ARENA_MAX, 1);
    const QCoreApplication application(argc, argv);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
}
