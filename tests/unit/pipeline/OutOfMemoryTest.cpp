// A program of its own: it replaces the allocation functions.
#include "pipeline/VisaFunctionCallHandler.h"

#include "RecordingListener.h"

#include <visa.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <new>

namespace
{
std::size_t s_largest = SIZE_MAX; ///< larger blocks are refused
}

void *operator new(std::size_t size)
{
    void *block = size <= s_largest ? std::malloc(size) : nullptr;
    if (!block)
        throw std::bad_alloc();
    return block;
}

void operator delete(void *block) noexcept
{
    std::free(block);
}

void operator delete(void *block, std::size_t) noexcept
{
    std::free(block);
}

namespace
{
TEST(OutOfMemory, AResultThatCannotBeCopiedIsDeliveredAsAFailure)
{
    const auto handler = std::make_unique<VisaFunctionCallHandler>(nullptr);
    RecordingListener panel(handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener label(handler.get(), VisaFunctionCallTyp::All);
    _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Read, 7, std::string(1000000, 'x'));
    s_largest = 500000;
    handler->VisaFunctionCallFinshed(call);
    s_largest = SIZE_MAX;

    for (int i = 0; i < 2; ++i) {
        finsihedFunctionCall record;
        ASSERT_TRUE(handler->getFinishedVisaFunctionCall(record));
        EXPECT_EQ(record.call.type, VisaFunctionCallTyp::Read);
        EXPECT_EQ(record.call.status, static_cast<ViStatus>(0xBFFF003C));
        EXPECT_EQ(record.call.parameter[0].stringValue, "");
    }

    call.status = VI_ERROR_TMO;
    s_largest = 500000;
    handler->VisaFunctionCallFinshed(call);
    s_largest = SIZE_MAX;
    finsihedFunctionCall record;
    ASSERT_TRUE(handler->getFinishedVisaFunctionCall(record));
    EXPECT_EQ(record.call.status, VI_ERROR_TMO) << "the call's own failure says more";
}
} // namespace
