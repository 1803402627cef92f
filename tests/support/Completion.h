#pragma once

#include <visa.h>

#include <gtest/gtest.h>
#include <string>

namespace test
{

/// What a VI_EVENT_IO_COMPLETION tells.
struct Completion {
    ViStatus waited = VI_ERROR_TMO; ///< by viWaitOnEvent
    ViStatus status = VI_ERROR_SYSTEM_ERROR;
    ViJobId job = VI_NULL;
    ViUInt64 count = 0;
    ViUInt32 count32 = 0;
    ViBuf buffer = nullptr;
    std::string operation;
    ViEventType type = 0;
};

inline void readAttributes(ViEvent context, Completion &completion)
{
    std::string name(256, '\0');
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_EVENT_TYPE, &completion.type), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_STATUS, &completion.status), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_JOB_ID, &completion.job), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_BUFFER, &completion.buffer), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_RET_COUNT_64, &completion.count), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_RET_COUNT_32, &completion.count32), VI_SUCCESS);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_OPER_NAME, name.data()), VI_SUCCESS);
    completion.operation = name.c_str();
}

/// Waits for the next one and closes its context.
inline Completion nextCompletion(ViSession session, ViUInt32 timeout = 30000)
{
    Completion completion;
    ViEvent context = VI_NULL;
    completion.waited = viWaitOnEvent(session, VI_EVENT_IO_COMPLETION, timeout, &completion.type, &context);
    if (completion.waited >= VI_SUCCESS) {
        readAttributes(context, completion);
        EXPECT_EQ(viClose(context), VI_SUCCESS);
    }
    return completion;
}

} // namespace test
