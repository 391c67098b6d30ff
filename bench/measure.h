#pragma once

#include <benchmark/benchmark.h>

#include <cstdint>
#include <string>

/// How the rows are measured and reported. A repetition of a benchmark is one run of a row: the
/// work of the product and its floor, one after the other, each timed by itself.
namespace bench {

/// Seconds of processor time, user and system, that this process has used.
double processorSeconds();

/// Seconds of processor time that `work` takes.
template <class Work>
double secondsOf(const Work& work) {
    const double start = processorSeconds();
    work();
    return processorSeconds() - start;
}

/// The most memory that this process has had in use at one time, in bytes.
std::int64_t peakMemory();

/// Reports one run of a row: its seconds as the time of the iteration, both as counters.
void reportTimes(benchmark::State& state, double seconds, double floorSeconds);

/// Registers a row. Each repetition is one run; their number comes from the command line.
#define BENCH_ROW(function, name) \
    BENCHMARK(function)->Name(name)->Iterations(1)->UseManualTime()->Unit(benchmark::kMillisecond)

/// A folder of its own in memory, or where there is none, among the temporary files.
class OutputFolder {
public:
    OutputFolder();
    OutputFolder(const OutputFolder&) = delete;
    OutputFolder& operator=(const OutputFolder&) = delete;
    ~OutputFolder(); ///< removes the folder with all in it
    std::string operator/(const std::string& name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

} // namespace bench
