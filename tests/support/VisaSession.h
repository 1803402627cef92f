#pragma once

#include <visa.h>

#include <cstdint>
#include <gtest/gtest.h>
#include <string>
#include <string_view>

namespace test
{

/// A resource manager and one session of the library under test. Closes what is open at its end.
class VisaSession
{
public:
    VisaSession() { EXPECT_EQ(viOpenDefaultRM(&rm), VI_SUCCESS); }
    ~VisaSession() { viClose(rm); }
    VisaSession(const VisaSession &) = delete;
    VisaSession &operator=(const VisaSession &) = delete;

    ViStatus open(const std::string &name, ViUInt32 timeout = 5000, ViAccessMode mode = 0)
    {
        return viOpen(rm, name.c_str(), mode, timeout, &vi);
    }
    ViStatus write(std::string_view data)
    {
        return viWrite(vi, reinterpret_cast<ViConstBuf>(data.data()), static_cast<ViUInt32>(data.size()), &count);
    }
    /// Reads at most @p size bytes into `text`.
    ViStatus read(std::uint32_t size = 1024)
    {
        text.assign(size, '\0');
        const ViStatus status = viRead(vi, reinterpret_cast<ViPBuf>(text.data()), size, &count);
        text.resize(count);
        return status;
    }
    ViStatus set(ViAttr attribute, ViAttrState value) { return viSetAttribute(vi, attribute, value); }
    template <typename Number>
    Number get(ViAttr attribute)
    {
        Number value{};
        EXPECT_EQ(viGetAttribute(vi, attribute, &value), VI_SUCCESS);
        return value;
    }
    std::string getText(ViAttr attribute)
    {
        std::string value(256, '\0');
        EXPECT_EQ(viGetAttribute(vi, attribute, value.data()), VI_SUCCESS);
        return value.c_str();
    }

    ViSession rm = VI_NULL;
    ViSession vi = VI_NULL;
    ViUInt32 count = 0;
    std::string text;
};

} // namespace test
