// A process that a test kills. It loads the plug-in as the service does, reports numbered events, and ends in
// the way that the test chooses.
//
//     child <database directory> <first number> <way>
//
// "stream" reports without end, and writes the number of each accepted event as a line. The other ways report
// a few thousand events and then call exit(0):
// "exit" on the main thread;
// "static" on the main thread, with a loader that exit() destroys;
// "crash" in the handler of a segmentation fault on another thread, while the main thread still reports;
// "callback" on the uploader's thread.

#include <csignal>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>

#include <unistd.h>

#include "Plugin/IMetrikSdk.h"
#include "Plugin/ModuleLoader.h"
#include "SystemTool/IO/Directory.h"
#include "tests/Modules/MetrikSdk/support/ReceivedEvents.h"

namespace {

using Loader = SystemTool::ModuleLoader<IMetrikSdk>;

constexpr int EVENTS_BEFORE_EXIT = 3000;

std::unique_ptr<Loader> g_loader; // exit() destroys it, unless it was released
IMetrikSdk* g_sdk = nullptr;
bool g_exitInCallback = false;

void OnFailure(std::string, std::string) {
    if (g_exitInCallback)
        std::exit(0);
}

void OnSuccess(std::string, std::string) {}

void OnSegmentationFault(int) {
    std::exit(0);
}

/// Sends the signal and makes no bad access, because a sanitizer would report that itself.
void Fault() {
    std::raise(SIGSEGV);
}

bool Report(int number) {
    return g_sdk->ReportEvent("A759|10001", NumberedPayload(number));
}

[[noreturn]] void Stream(int number) {
    for (;; ++number) {
        if (!Report(number))
            continue;
        const auto line = std::to_string(number) + "\n";
        if (::write(STDOUT_FILENO, line.data(), line.size()) < 0)
            std::_Exit(2);
    }
}

[[noreturn]] void CrashElsewhere(int number) {
    std::signal(SIGSEGV, &OnSegmentationFault);
    std::thread(&Fault).detach();
    for (;; ++number)
        Report(number);
}

[[noreturn]] void ReportForEver(int number) {
    for (;; ++number)
        Report(number);
}

} // namespace

int main(int, char** arguments) {
    const std::string directory = arguments[1];
    ::setenv("XDG_DATA_HOME", directory.c_str(), 1); // the plug-in may make missing directories below it
    int number = std::stoi(arguments[2]);
    const std::string way = arguments[3];
    g_exitInCallback = way == "callback";
    g_loader =
        std::make_unique<Loader>(SystemTool::IO::Directory::GetExcutableDirectory() + "libMetrikSdk.dylib");
    g_sdk = g_loader->GetModule();
    if (way != "static") // exit() never destroys the service's loaders
        static_cast<void>(g_loader.release());
    if (!g_sdk->InitSdk("A759", "1", "default", "", directory, &OnFailure, &OnSuccess))
        return 3;
    if (way == "stream")
        Stream(number);
    for (int i = 0; i < EVENTS_BEFORE_EXIT; ++i)
        Report(number++);
    if (way == "crash")
        CrashElsewhere(number);
    if (way == "callback")
        ReportForEver(number);
    std::exit(0);
}
