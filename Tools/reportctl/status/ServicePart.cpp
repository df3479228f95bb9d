#include <filesystem>

#include <sys/stat.h>

#include "SystemTool/Version.h"
#include "Tools/reportctl/service/Lock.h"
#include "Tools/reportctl/service/Processes.h"
#include "Tools/reportctl/service/Program.h"
#include "Tools/reportctl/status/Parts.h"

namespace reportctl::status {
namespace {

namespace fs = std::filesystem;

std::optional<std::string> Known(const std::string& text) {
    return text.empty() ? std::nullopt : std::optional(text);
}

/// When a process started, by the time of its folder in /proc. The folder is made at the start or a moment
/// later.
std::optional<std::int64_t> StartOf(pid_t process) {
    struct stat status {};
    if (::stat(("/proc/" + std::to_string(process)).c_str(), &status) != 0)
        return std::nullopt;
    return std::int64_t{status.st_mtim.tv_sec} * 1000 + status.st_mtim.tv_nsec / 1'000'000;
}

PortHolder Described(std::optional<pid_t> process) {
    const auto user = process ? service::OwnerOf(*process) : std::nullopt;
    return {process, process ? service::ProgramNameOf(*process) : std::nullopt,
            user ? service::NameOf(*user) : ""};
}

void Describe(Service& service, const service::Lock& lock) {
    service.lockProblem = lock.problem;
    if (lock.isHeld)
        service.lockHolder = Described(lock.holder);
}

/// Finds the service's process: the one that counts in this user's ledger. When none counts there, the
/// service that holds the machine's lock, if it is this user's.
void FindProcess(Service& service, const ReportLedger::Look& ledger, const service::Lock& lock, uid_t owner) {
    const bool isService = lock.holder && service::IsService(*lock.holder);
    const auto user = isService ? service::OwnerOf(*lock.holder) : std::nullopt;
    if (ledger.counting)
        service.process = static_cast<pid_t>(ledger.process);
    else if (user == owner)
        service.process = lock.holder;
    else if (user)
        service.otherUser = service::NameOf(*user);
    service.isRunning = service.process.has_value();
}

void DescribeProcess(Service& service, const ReportLedger::Look& ledger) {
    if (ledger.counting) {
        service.startedAtMs = ledger.startedAtMs;
        service.version = Known(ledger.programVersion);
        service.buildId = Known(ledger.buildId);
    } else if (service.isRunning) {
        const auto program = SystemTool::Version::Of("/proc/" + std::to_string(*service.process) + "/exe");
        service.startedAtMs = StartOf(*service.process);
        service.version = Known(program.version);
        service.buildId = Known(program.buildId);
    }
}

/// Whether the socket is the service's. When this user may not see the process's sockets, every socket of the
/// process's user counts as the service's.
bool IsOf(const service::BoundSocket& socket, const Service& service, uid_t owner) {
    return service.isRunning &&
           service::HasSocket(*service.process, socket.inode).value_or(socket.owner == owner);
}

PortHolder Holder(std::optional<pid_t> process, uid_t owner) {
    return {process, process ? service::ProgramNameOf(*process) : std::nullopt, service::NameOf(owner)};
}

/// A program that allows it shares the address with others of its user, and the kernel gives each sender's
/// datagrams to one of them. A socket that is bound to all addresses gets nothing beside the service's.
void FindPortSharer(Service& service, const service::BoundSocket& other) {
    if (other.isAtTheServicesAddress && !service.portSharer)
        service.portSharer = Holder(service::ProcessOfSocket(other.inode), other.owner);
}

void FindPortHolder(Service& service, uid_t owner) {
    const auto sockets = service::SocketsAtTheServicesPort();
    for (const auto& socket : sockets)
        if (IsOf(socket, service, owner)) {
            service.isListening = true;
            service.intake = Intake{socket.unreadBytes, socket.dropped};
        }
    if (service.isListening) {
        service.portHolder = Holder(service.process, owner);
        for (const auto& socket : sockets)
            if (!IsOf(socket, service, owner))
                FindPortSharer(service, socket);
    } else if (!sockets.empty()) {
        service.portHolder = Holder(service::ProcessOfSocket(sockets.front().inode), sockets.front().owner);
    }
}

bool HasPlugin(const Service& service, const std::string& library) {
    if (service.isRunning)
        if (const auto loaded = service::HasLoaded(*service.process, library))
            return *loaded;
    std::error_code error;
    return fs::exists(fs::path(service::ProgramPath()).parent_path() / library, error);
}

} // namespace

Service LookAtService(const ReportLedger::Look& ledger, uid_t owner) {
    Service service;
    const auto lock = service::LookAtLock();
    Describe(service, lock);
    FindProcess(service, ledger, lock, owner);
    DescribeProcess(service, ledger);
    FindPortHolder(service, owner);
    service.hasLogger = HasPlugin(service, "libBoostLogger.dylib");
    service.hasStore = HasPlugin(service, "libOrvekSqlite.dylib");
    service.hasSdk = HasPlugin(service, "libMetrikSdk.dylib");
    return service;
}

} // namespace reportctl::status
