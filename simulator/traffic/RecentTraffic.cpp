#include "simulator/traffic/RecentTraffic.h"

#include "simulator/traffic/LogLine.h"

namespace simulator
{

RecentTraffic::RecentTraffic(TrafficLog &log) : m_log(log)
{
    m_log.add(*this);
}

RecentTraffic::~RecentTraffic()
{
    m_log.remove(*this);
}

void RecentTraffic::seen(const TrafficLog::Entry &entry)
{
    if (m_lines.size() == Capacity)
        m_lines.pop_front();
    m_lines.push_back({timeOfDay(entry.time), std::string(entry.protocol), std::string(entry.client),
                       std::string(arrowOf(entry.kind)), std::string(entry.text)});
}

} // namespace simulator
