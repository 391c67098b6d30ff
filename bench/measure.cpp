#include "measure.h"

#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace bench {

double processorSeconds() {
    timespec time{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

/// From the process's own memory map: what `getrusage` tells may stem from before its program was
/// started.
std::int64_t peakMemory() {
    std::ifstream status("/proc/self/status");
    std::string word;
    while (status >> word) {
        std::int64_t kibibytes = 0;
        if (word == "VmHWM:" && status >> kibibytes)
            return kibibytes * 1024;
    }
    throw std::runtime_error("the system does not tell the peak memory");
}

void reportTimes(benchmark::State& state, double seconds, double floorSeconds) {
    state.SetIterationTime(seconds);
    state.counters["seconds"] = seconds;
    state.counters["floor"] = floorSeconds;
    state.counters["ratio"] = seconds / floorSeconds;
}

OutputFolder::OutputFolder() {
    const std::filesystem::path memory = "/dev/shm";
    const auto parent =
        std::filesystem::is_directory(memory) ? memory : std::filesystem::temp_directory_path();
    path_ = (parent / "bench_XXXXXX").string();
    if (!::mkdtemp(path_.data()))
        throw std::runtime_error("no folder for the output in " + parent.string());
}

OutputFolder::~OutputFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

} // namespace bench
