#include "bench/Measurement.h"

#include <sched.h>

#include <cstdio>
#include <cstdlib>

namespace bench
{

void Measurement::add(const std::string &series, const std::vector<double> &batch)
{
    m_series[series].push_back(batch);
}

void Measurement::setValue(const std::string &name, double value)
{
    m_values[name] = value;
}

void Measurement::print() const
{
    std::fputs("{\"series\": {", stdout);
    const char *betweenSeries = "\n ";
    for (const auto &[name, batches] : m_series) {
        std::printf("%s\"%s\": [", betweenSeries, name.c_str());
        betweenSeries = ",\n ";
        const char *betweenBatches = "";
        for (const std::vector<double> &batch : batches) {
            std::fputs(betweenBatches, stdout);
            betweenBatches = ",\n  ";
            const char *between = "[";
            for (const double sample : batch) {
                std::printf("%s%.2f", between, sample);
                between = ", ";
            }
            std::fputs("]", stdout);
        }
        std::fputs("]", stdout);
    }
    std::fputs("},\n \"values\": {", stdout);
    const char *between = "";
    for (const auto &[name, value] : m_values) {
        std::printf("%s\"%s\": %.17g", between, name.c_str(), value);
        between = ", ";
    }
    std::fputs("}}\n", stdout);
}

void runOn(int core)
{
    cpu_set_t cores;
    CPU_ZERO(&cores);
    CPU_SET(core, &cores);
    sched_setaffinity(0, sizeof cores, &cores);
}

std::size_t numberOption(int argc, char **argv, const std::string &option, std::size_t otherwise)
{
    for (int i = 1; i + 1 < argc; ++i)
        if (argv[i] == option)
            return static_cast<std::size_t>(std::strtoull(argv[i + 1], nullptr, 10));
    return otherwise;
}

} // namespace bench
