#include "finder/SearchResult.h"

#include "pipeline/VisaFunctionCall.h"

SearchResult::SearchResult(const _visaFunctionCall &call)
    : resource(QString::fromStdString(call.parameter[0].stringValue))
{
    if (call.parameter[2].uintValue == 0)
        return;
    identification = QString::fromStdString(call.parameter[1].stringValue);
    const std::string &texts = call.parameter[2].stringValue;
    const std::size_t zero = texts.find('\0');
    description = QString::fromStdString(texts.substr(0, zero));
    if (zero != std::string::npos)
        hostName = QString::fromStdString(texts.substr(zero + 1));
}
