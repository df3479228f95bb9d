#pragma once

#include <cstdint>
#include <string>

/// The analytics SDK that the plug-in libMetrikSdk.dylib implements. The order of the operations is the
/// plug-in's binary interface.
///
/// Ownership: only the plug-in makes and destroys its objects ("CreateModule", "DestoryModule").
/// Threads: one thread at a time uses an object. The callbacks come on any thread, also on the SDK's own
/// threads, and never after the object is destroyed.
class IMetrikSdk {
public:
    /// Called when something failed or succeeded, with two texts. The SDK decides what they mean.
    using Callback = void (*)(std::string, std::string);

    /// The SDK's version, for a person who examines an installation. The service never calls it.
    virtual std::string GetSdkVersion() = 0;

    /// How many accepted events are still on this machine, counted over all modules that share this object's
    /// database directory; -1 when the number is not known. The service never calls it.
    virtual std::int64_t GetPendingCount() = 0;

    /// Starts the SDK for one module. `logDir` is the directory for its logs, `dbDir` the one for its files.
    virtual bool InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName,
                         std::string logDir, std::string dbDir, Callback onFailure, Callback onSuccess) = 0;

    /// Delivers one event. After true, the event survives the end of the process, however it ends.
    virtual bool ReportEvent(std::string eventId, std::string eventJson) = 0;

protected:
    ~IMetrikSdk() = default;
};
