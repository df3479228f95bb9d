#pragma once

#include <cstdint>
#include <string>

/// The analytics SDK that the plug-in libMetrikSdk.dylib implements. The order of the operations is the
/// plug-in's binary interface.
///
/// Ownership: objects are made and destroyed by their plug-in alone ("CreateModule", "DestoryModule").
/// Threads: the operations of one object by one thread at a time; the callbacks come on any thread, the SDK's
/// own included, and never after the object is destroyed.
class IMetrikSdk {
public:
    /// Told what failed or succeeded, and with what: two texts whose meaning is the SDK's.
    using Callback = void (*)(std::string, std::string);

    /// The SDK's version, for a person who examines an installation. The service never calls it.
    virtual std::string GetSdkVersion() = 0;

    /// How many accepted events have not left this machine yet, over all modules that share this object's
    /// database directory; -1 when that cannot be told. The service never calls it.
    virtual std::int64_t GetPendingCount() = 0;

    /// Starts the SDK for one module. Its logs and its files belong into the two directories.
    virtual bool InitSdk(std::string moduleId, std::string moduleVersion, std::string moduleName,
                         std::string logDir, std::string dbDir, Callback onFailure, Callback onSuccess) = 0;

    /// Delivers one event. After true, the event survives the end of the process, however it ends.
    virtual bool ReportEvent(std::string eventId, std::string eventJson) = 0;

protected:
    ~IMetrikSdk() = default;
};
