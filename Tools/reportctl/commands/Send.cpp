#include "Tools/reportctl/commands/Commands.h"

#include <cerrno>
#include <chrono>
#include <memory>
#include <optional>

#include <CLI/CLI.hpp>
#include <Poco/Exception.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <unistd.h>

#include "Common/Records.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/send/Delivery.h"
#include "Tools/reportctl/send/Messages.h"

namespace reportctl::commands {
namespace {

constexpr auto STANDARD_INPUT = "-";

constexpr auto HELP =
    "Examples:\n"
    "  reportctl send --event 'B100|10001' --value 'opened the door'\n"
    "  reportctl send --event 'A759|10001' --value '{\"clicks\":3}' --time 1700000000\n"
    "  reportctl send init --module A100 --version 1.2 --name editor --log-path /tmp/log --db-path /tmp/db\n"
    "  reportctl send open-id u4711 --suite-version 5.1.0.2\n"
    "  reportctl send --file reports.txt --rate 200\n"
    "  reportctl send --event 'B100|10001' --dry-run | sed s/B100/B200/ | reportctl send -\n"
    "\n"
    "The service sends no answer. \"sent\" means that a program listens on its port, and no more: whether\n"
    "the service took the message is in its log and in the store.\n"
    "\n";

struct SendOptions {
    std::optional<std::string> eventID; ///< for a report
    std::string value;
    std::optional<std::int64_t> time;
    bool isDayReport = false;

    SyncServiceReport::ST_InitMsg module;     ///< for `init`
    std::string openID;                       ///< for `open-id`
    std::string suiteVersion;                 ///< for `open-id`
    std::optional<std::string> file;          ///< for a file of lines
    std::optional<std::string> standardInput; ///< "-" when the user gave it

    send::DeliverySettings delivery;
};

std::int64_t NowMs() {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::milliseconds>(now).count();
}

int SendReport(const SendOptions& options) {
    return send::DeliverOne(send::BuildReport({.eventID = *options.eventID,
                                               .value = options.value,
                                               .createTime = options.time ? *options.time : NowMs(),
                                               .isDayReport = options.isDayReport}),
                            options.delivery);
}

int SendLines(const std::string& path, const send::DeliverySettings& settings) {
    if (path == STANDARD_INPUT)
        return send::DeliverLines(STDIN_FILENO, settings);
    const SystemTool::IO::Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (file.IsOpen())
        return send::DeliverLines(file.Number(), settings);
    fmt::print(stderr, "error: cannot open {}: {}\n", path, SystemTool::ErrnoText(errno));
    return 1;
}

int Send(const CLI::App& send, const SendOptions& options) {
    if (send.got_subcommand("init"))
        return send::DeliverOne(send::BuildInit(options.module), options.delivery);
    if (send.got_subcommand("open-id"))
        return send::DeliverOne(send::BuildOpenIdUpdate(options.openID, options.suiteVersion),
                                options.delivery);
    if (options.eventID)
        return SendReport(options);
    return SendLines(options.file ? *options.file : STANDARD_INPUT, options.delivery);
}

/// Checks that the user named exactly one source of messages. The parser cannot check it, because its rules
/// do not work across subcommands.
void RequireOneSource(const CLI::App& send, const SendOptions& options) {
    const auto sources = send.get_subcommands().size() + (options.eventID ? 1U : 0U) +
                         (options.file ? 1U : 0U) + (options.standardInput ? 1U : 0U);
    if (sources != 1)
        throw CLI::RequiredError("Say once what to send: --event, init, open-id, --file or -",
                                 CLI::ExitCodes::RequiredError);
}

int RunSend(const CLI::App& send, const SendOptions& options) {
    RequireOneSource(send, options);
    try {
        return Send(send, options);
    } catch (const Poco::Exception& error) {
        fmt::print(stderr, "error: {}\n", error.displayText());
        return 1;
    }
}

void AddReport(CLI::App& send, SendOptions& options) {
    auto* event =
        send.add_option("--event", options.eventID,
                        "Send a report of this event, such as B100|10001. One that begins with \"A\" "
                        "goes to analytics, any other to the store");
    send.add_option("--value", options.value,
                    "The report's value: JSON of an object is sent as an object, any other text as a string")
        ->needs(event);
    send.add_option(
            "--time", options.time,
            "When it happened, since 1970: ten digits are seconds, thirteen milliseconds. Without it: "
            "now")
        ->needs(event);
    send.add_flag("--day-report", options.isDayReport, "Mark it as a day's report")->needs(event);
}

void AddInit(CLI::App& send, SendOptions& options) {
    auto* init = send.add_subcommand("init", "Announce an analytics module")->fallthrough();
    init->add_option("--module", options.module.moduleID, "The module's id, such as A100")->required();
    init->add_option("--version", options.module.moduleVersion, "The module's version");
    init->add_option("--name", options.module.moduleName, "The module's name");
    init->add_option("--log-path", options.module.logPath, "The directory of its logs");
    init->add_option("--db-path", options.module.dbPath, "The directory of its events' outbox");
    init->add_option("--open-id", options.module.openID, "The open id of the user who is signed in");
    init->add_option("--suite-version", options.module.hublinkVersion,
                     "The installed suite's version; taken over only together with an open id");
}

void AddOpenId(CLI::App& send, SendOptions& options) {
    auto* openId = send.add_subcommand("open-id", "Tell who is signed in")->fallthrough();
    openId->add_option("OPEN-ID", options.openID, "The user's open id")->required();
    openId->add_option("--suite-version", options.suiteVersion, "The installed suite's version");
}

void AddLines(CLI::App& send, SendOptions& options) {
    const CLI::Validator isDash(
        [](const std::string& text) {
            return text == STANDARD_INPUT ? ""
                                          : fmt::format("\"{}\" is none of init, open-id and - (for a file, "
                                                        "see --file)",
                                                        text);
        },
        "");
    send.add_option("--file", options.file, "Send each line of this file as it is; - is standard input");
    send.add_option("input", options.standardInput, "- alone: the same as --file -")->check(isDash);
    send.add_option("--rate", options.delivery.pace.perSecond,
                    "Lines a second, at the most. Datagrams that come faster than the service takes them are "
                    "lost, and no message says so")
        ->capture_default_str()
        ->check(CLI::Range(1, 1'000'000));
}

} // namespace

void AddSend(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<SendOptions>();
    auto* send = app.add_subcommand(
        "send",
        "Send the running service a report or a control message, from flags or line by line. What the "
        "service would refuse, cut or lose is not sent; the reason is printed.");
    AddReport(*send, *options);
    AddInit(*send, *options);
    AddOpenId(*send, *options);
    AddLines(*send, *options);
    send->add_flag("--dry-run", options->delivery.dryRun, "Print what would be sent and send nothing");
    send->add_flag("--anyway", options->delivery.anyway,
                   "Send also what the service would refuse, cut or lose; the reasons become warnings");
    send->footer(HELP + app.get_footer());
    send->callback([send, options, &exitCode] { exitCode = RunSend(*send, *options); });
}

} // namespace reportctl::commands
