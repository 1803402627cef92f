#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace bench
{

/**
 * What one run of a benchmark program measured: for each series, batches of samples in the order in which they were taken.
 *
 * The two sides of a row take turns batch by batch, so that the n-th batches of both met the same machine; scripts/bench forms a
 * ratio of each such pair. print() writes one JSON object to stdout:
 *
 *     {"series": {"bareSocketQuery": [[17512, 17498, ...], ...]}, "values": {"allocationsOfALine": 0}}
 */
class Measurement
{
public:
    /// Nanoseconds of each sample.
    void add(const std::string &series, const std::vector<double> &batch);
    void setValue(const std::string &name, double value);
    void print() const;

private:
    std::map<std::string, std::vector<std::vector<double>>> m_series;
    std::map<std::string, double> m_values;
};

/// Nanoseconds that each of @p count calls took; @p warmUp calls before them are not counted.
template <typename Call>
std::vector<double> timeEach(std::size_t warmUp, std::size_t count, Call call)
{
    using Clock = std::chrono::steady_clock;
    std::vector<double> batch(count);
    for (std::size_t i = 0; i < warmUp; ++i)
        call();
    Clock::time_point before = Clock::now();
    for (double &sample : batch) {
        call();
        const Clock::time_point after = Clock::now();
        sample = std::chrono::duration<double, std::nano>(after - before).count();
        before = after;
    }
    return batch;
}

/// Keeps the calling thread, and what it starts, on one core. Refused on a machine that has not got it: all share one then.
void runOn(int core);

/// The number behind @p option on the command line, or @p otherwise.
std::size_t numberOption(int argc, char **argv, const std::string &option, std::size_t otherwise);

} // namespace bench
