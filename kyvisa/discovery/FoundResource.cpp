#include "kyvisa/discovery/FoundResource.h"

namespace kyvisa
{

void fillIn(LxiTexts &texts, const LxiTexts &more)
{
    for (std::string LxiTexts::*text : {&LxiTexts::manufacturer, &LxiTexts::model, &LxiTexts::serialNumber,
                                        &LxiTexts::version, &LxiTexts::description, &LxiTexts::hostName})
        if ((texts.*text).empty())
            texts.*text = more.*text;
}

} // namespace kyvisa
