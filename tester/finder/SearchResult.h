#pragma once

#include <QString>

struct _visaFunctionCall;

/// What a search tells about one resource.
struct SearchResult {
    SearchResult() = default;
    /**
     * From a finished FindRsrc or FindNext: slot 0 holds the resource string, slot 1 the identification, slot 2 the
     * description, a zero byte and the host name. Slot 2's number is zero when there is no such information.
     */
    explicit SearchResult(const _visaFunctionCall &call);

    QString resource;
    QString identification; ///< manufacturer, model, serial number and version
    QString description;
    QString hostName; ///< empty for what is not in the network
};
