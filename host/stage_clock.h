#pragma once

#include "b_containers.h"

#include <chrono>

namespace host {

/// Measures how long the stages of a run take.
class StageClock {
public:
    struct Stage {
        const char* name;
        double seconds;
    };

    /// Ends the present stage and begins the next one. The name must outlive the clock.
    void begin(const char* stage) {
        end();
        present_ = stage;
        start_ = Clock::now();
    }
    void end() {
        if (present_)
            stages_.push_back({present_, secondsSince(start_)});
        present_ = nullptr;
    }

    const base::vector<Stage>& stages() const { return stages_; }
    double totalSeconds() const { return secondsSince(processStart_); }

private:
    using Clock = std::chrono::steady_clock;
    static double secondsSince(Clock::time_point start) {
        return std::chrono::duration<double>(Clock::now() - start).count();
    }

    base::vector<Stage> stages_;
    const char* present_ = nullptr;
    Clock::time_point start_;
    Clock::time_point processStart_ = Clock::now();
};

} // namespace host
