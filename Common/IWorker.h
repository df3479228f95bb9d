#pragma once

#include "Common/Records.h"

namespace SyncServiceReport {

/// Somewhere a report can end. Called on the consuming thread only.
class IWorker {
public:
    virtual ~IWorker() = default;

    /// Takes one report; false when it did not arrive (the worker has logged why, where there is something to
    /// say).
    virtual bool Send(const ST_OptLog& log) = 0;
};

} // namespace SyncServiceReport
