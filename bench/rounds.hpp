// Interleaved rounds against a baseline: in every round each case times one pass of what it
// measures and one pass of its baseline (memcpy of the same bytes, or the direct tool call) over
// the same data, the two in alternating order, and the cases take turns round by round, so that
// a noisy neighbour slows both sides alike. Times are the thread's CPU time, so that a round in
// which the thread waited for a core does not count the wait. The table gives medians with
// [min, max].
#pragma once

#include <time.h>

#include <algorithm>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

namespace vorcal::bench {

struct Spread {
    double median, min, max;
};

inline Spread SpreadOf(std::vector<double> v)
{
    std::sort(v.begin(), v.end());
    const size_t n = v.size();
    return {n % 2 ? v[n / 2] : (v[n / 2 - 1] + v[n / 2]) / 2, v.front(), v.back()};
}

struct RoundCase {
    std::string name;
    double bytes = 0;                 // source bytes of one pass
    double items = 0;                 // frames of one pass
    int passes = 1;                   // passes timed together in a round
    std::function<void()> subject;    // one pass of what is measured
    std::function<void()> baseline;   // one pass of its baseline
    std::vector<double> subjectSeconds, baselineSeconds;
};

inline double ThreadSeconds()
{
    timespec t;
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

inline double TimePasses(const std::function<void()> &pass, int passes)
{
    const double t0 = ThreadSeconds();
    for (int i = 0; i < passes; ++i)
        pass();
    return (ThreadSeconds() - t0) / passes;
}

inline void RunRounds(std::vector<RoundCase> &cases, int rounds)
{
    for (RoundCase &c : cases) { // first touch of every page before the clock runs
        c.subject();
        c.baseline();
    }
    for (int r = 0; r < rounds; ++r) {
        for (RoundCase &c : cases) {
            if (r % 2 == 0) {
                c.subjectSeconds.push_back(TimePasses(c.subject, c.passes));
                c.baselineSeconds.push_back(TimePasses(c.baseline, c.passes));
            } else {
                c.baselineSeconds.push_back(TimePasses(c.baseline, c.passes));
                c.subjectSeconds.push_back(TimePasses(c.subject, c.passes));
            }
        }
    }
}

// One line per case: ns per frame of the subject and of the baseline, GB/s of both, and the
// speed against the baseline (baseline time / subject time) per round.
inline void PrintRounds(const std::vector<RoundCase> &cases, const char *pTitle, const char *pBaseline)
{
    std::printf("\n%s: %zu rounds, medians [min, max]; baseline: %s\n", pTitle,
                cases.empty() ? size_t{0} : cases[0].subjectSeconds.size(), pBaseline);
    std::printf("%-46s %22s %22s %22s %22s %22s\n", "case", "ns/frame", "baseline ns/frame", "GB/s", "baseline GB/s",
                "speed vs baseline");
    for (const RoundCase &c : cases) {
        std::vector<double> perFrame, basePerFrame, rate, baseRate, speed;
        for (size_t i = 0; i < c.subjectSeconds.size(); ++i) {
            perFrame.push_back(c.subjectSeconds[i] * 1e9 / c.items);
            basePerFrame.push_back(c.baselineSeconds[i] * 1e9 / c.items);
            rate.push_back(c.bytes / c.subjectSeconds[i] / 1e9);
            baseRate.push_back(c.bytes / c.baselineSeconds[i] / 1e9);
            speed.push_back(c.baselineSeconds[i] / c.subjectSeconds[i]);
        }
        auto Cell = [](const std::vector<double> &v, const char *pFormat) {
            const Spread s = SpreadOf(v);
            char buf[64];
            std::snprintf(buf, sizeof buf, pFormat, s.median, s.min, s.max);
            return std::string(buf);
        };
        std::printf("%-46s %22s %22s %22s %22s %22s\n", c.name.c_str(), Cell(perFrame, "%.1f [%.1f, %.1f]").c_str(),
                    Cell(basePerFrame, "%.1f [%.1f, %.1f]").c_str(), Cell(rate, "%.1f [%.1f, %.1f]").c_str(),
                    Cell(baseRate, "%.1f [%.1f, %.1f]").c_str(), Cell(speed, "%.3f [%.3f, %.3f]").c_str());
    }
    std::fflush(stdout);
}

// Passes that make a round of a cache-hot case last about a millisecond.
inline int PassesFor(double bytes)
{
    return std::max(1, static_cast<int>(40e6 / std::max(bytes, 1.0)));
}

} // namespace vorcal::bench
