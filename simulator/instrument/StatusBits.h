#pragma once

#include <cstdint>

/// Bits of the registers of IEEE 488.2 and SCPI-99.
namespace simulator
{

enum StatusByteBit : std::uint8_t {
    StbErrorAvailable = 0x04,   ///< error queue not empty
    StbQuestionable = 0x08,     ///< summary of STATus:QUEStionable
    StbMessageAvailable = 0x10, ///< MAV
    StbStandardEvent = 0x20,    ///< ESB
    StbRequestService = 0x40,   ///< RQS in a serial poll, MSS in *STB?
    StbOperation = 0x80,        ///< summary of STATus:OPERation
};

enum StandardEventBit : std::uint8_t {
    EsrOperationComplete = 0x01,
    EsrRequestControl = 0x02,
    EsrQueryError = 0x04,
    EsrDeviceError = 0x08,
    EsrExecutionError = 0x10,
    EsrCommandError = 0x20,
    EsrUserRequest = 0x40,
    EsrPowerOn = 0x80,
};

enum OperationBit : std::uint16_t {
    OperationMeasuring = 0x0010,
    OperationWaitingForTrigger = 0x0020,
};

enum QuestionableBit : std::uint16_t {
    QuestionableVoltage = 0x0001, ///< an output does not hold its voltage because its current limit does
    QuestionableCurrent = 0x0002, ///< a current protection has tripped
};

} // namespace simulator
