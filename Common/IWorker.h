#pragma once

#include "Common/Records.h"

namespace SyncServiceReport {

/// A destination of reports. Called on the consuming thread only.
class IWorker {
public:
    virtual ~IWorker() = default;

    /// Takes one report. False when the report was not delivered. The reason is not always logged here: a
    /// missing plug-in is logged once, at the start.
    virtual bool Send(const ST_OptLog& log) = 0;
};

} // namespace SyncServiceReport
