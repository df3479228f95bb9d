#include "Tools/reportctl/send/Delivery.h"

#include <cstdio>
#include <optional>
#include <thread>
#include <vector>

#include <Poco/Exception.h>
#include <fmt/format.h>

#include "Common/ServiceConstants.h"
#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/message/Message.h"
#include "Tools/reportctl/send/Announced.h"
#include "Tools/reportctl/send/Judgement.h"
#include "Tools/reportctl/send/LineReader.h"
#include "Tools/reportctl/send/Sender.h"
#include "Tools/reportctl/terminal/Output.h"
#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::send {
namespace {

constexpr auto BLANK = " \t\r\n";

/// The beginning of an output line that says where a message came from: empty, or "line 3: ".
using Origin = std::string;

void TellError(const Origin& origin, const std::string& text) {
    terminal::FlushOutput();
    fmt::print(stderr, "error: {}{}\n", origin, text);
}

void TellNoListener(const Origin& origin) {
    TellError(origin, fmt::format("no program listens on {}; is the service running?", Sender::Address()));
}

void TellWarning(const Origin& origin, const std::string& text) {
    terminal::FlushOutput();
    fmt::print(stderr, "warning: {}{}\n", origin, text);
}

/// Prints what is wrong with a message. Returns true when it shall be sent.
bool MaySend(const Origin& origin, const Judgement& judgement, bool anyway) {
    for (const auto& warning : judgement.warnings)
        TellWarning(origin, warning);
    for (const auto& error : judgement.errors)
        anyway ? TellWarning(origin, error) : TellError(origin, error);
    return anyway || judgement.errors.empty();
}

/// Judges what depends on the running service: whether it knows the module. It looks only for events, because
/// looking reads the log.
class ServiceState {
public:
    void Judge(Judgement& judgement, const std::string& text) {
        const auto message = message::Read(text);
        if (!message.fault.empty() || message.module.empty())
            return;
        if (message.kind == message::Kind::Event && Known().Lacks(message.module))
            judgement.warnings.push_back(fmt::format(
                "the module \"{}\" has not announced itself to the running service, which drops its "
                "events until then: reportctl send init --module {}",
                message.module, terminal::ShellQuoted(message.module)));
        if (message.kind == message::Kind::Control &&
            message.control == SyncServiceReport::ORVEK_REPORT_MODULEINIT)
            m_announced.push_back(message.module);
    }

private:
    Announced& Known() {
        if (!m_known)
            m_known.emplace(log::LogDirectory());
        for (; !m_announced.empty(); m_announced.pop_back())
            m_known->Add(m_announced.back());
        return *m_known;
    }

    std::optional<Announced> m_known;
    std::vector<std::string> m_announced; ///< the modules that messages of this command announce
};

/// Prints only the text on standard output, so that it can be piped into a file or another program.
void PrintText(const std::string& text) {
    std::fwrite(text.data(), 1, text.size(), stdout);
    std::fputc('\n', stdout);
}

/// Whether the line is blank. A line of which only the beginning was kept does not count as blank.
bool IsBlank(const LineReader& lines) {
    return lines.IsWhole() && lines.Text().find_first_not_of(BLANK) == std::string::npos;
}

std::string Count(std::size_t count, const std::string& thing) {
    return fmt::format("{} {}{}", count, thing, count == 1 ? "" : "s");
}

/// Sends the given lines at the pace of the settings, and counts them.
class LineDelivery {
public:
    explicit LineDelivery(const DeliverySettings& settings) : m_settings(settings) {}

    /// Judges and sends one line. Returns false when no further line should be sent, because no program
    /// listens.
    bool Deliver(std::size_t number, const LineReader& lines) {
        const auto origin = fmt::format("line {}: ", number);
        const auto& line = lines.Text();
        auto judgement = lines.IsWhole() ? Judge(line) : JudgeLonger(lines.Bytes());
        if (lines.IsWhole())
            m_service.Judge(judgement, line);
        if (!MaySend(origin, judgement, m_settings.anyway)) {
            ++m_bad;
            return true;
        }
        if (m_settings.dryRun && !lines.IsWhole()) {
            TellError(origin, "no datagram can hold it");
            ++m_bad;
            return true;
        }
        try {
            return CountSent(number, line);
        } catch (const Poco::Exception& error) { // the line is longer than any datagram can be
            TellError(origin, error.displayText());
            ++m_bad;
            return true;
        }
    }

    /// Waits a moment, because the system may report late that no program listened to the last lines.
    void AwaitRefusal() {
        if (m_settings.dryRun || m_sent == 0 || !m_stop.empty() || m_sender.IsHeard())
            return;
        TellNoListener("");
        m_stop = "; the last of them were lost";
    }

    /// Prints the summary and returns the exit code.
    int Close() const {
        terminal::FlushOutput();
        fmt::print(m_settings.dryRun ? stderr : stdout, "{} {} ({}){}{}\n",
                   m_settings.dryRun ? "dry run: would send" : "sent", Count(m_sent, "message"),
                   Count(m_bytes, "byte"),
                   m_bad == 0 ? "" : fmt::format("; left out {}", Count(m_bad, "line")), m_stop);
        return m_bad == 0 && m_stop.empty() ? 0 : 1;
    }

private:
    bool CountSent(std::size_t number, const std::string& line) {
        if (Send(line)) {
            ++m_sent;
            m_bytes += line.size();
            return true;
        }
        TellNoListener(fmt::format("line {}: ", number));
        m_stop = fmt::format("; stopped at line {}", number);
        return false;
    }

    bool Send(const std::string& line) {
        if (m_settings.dryRun) {
            PrintText(line);
            return true;
        }
        const auto now = std::chrono::steady_clock::now();
        m_due = NextDue(m_due, now, m_settings.pace);
        std::this_thread::sleep_until(m_due);
        return m_sender.Send(line);
    }

    const DeliverySettings& m_settings;
    ServiceState m_service;
    Sender m_sender;
    std::chrono::steady_clock::time_point m_due;
    std::size_t m_sent = 0;
    std::size_t m_bytes = 0;
    std::size_t m_bad = 0;
    std::string m_stop; ///< why it ended early, for the summary
};

} // namespace

int DeliverOne(const std::string& text, const DeliverySettings& settings) {
    auto judgement = Judge(text);
    ServiceState().Judge(judgement, text);
    if (!MaySend("", judgement, settings.anyway)) {
        TellError("", "nothing was sent. With --anyway it is sent as it is");
        return 1;
    }
    if (settings.dryRun) {
        PrintText(text);
        terminal::FlushOutput();
        fmt::print(stderr, "dry run: would send {} ({})\n", judgement.what, Count(text.size(), "byte"));
        return 0;
    }
    Sender sender;
    if (!sender.Send(text) || !sender.IsHeard()) {
        TellNoListener("");
        return 1;
    }
    fmt::print("sent {} ({})\n", judgement.what, Count(text.size(), "byte"));
    return 0;
}

int DeliverLines(int descriptor, const DeliverySettings& settings) {
    LineDelivery delivery(settings);
    LineReader lines(descriptor);
    for (std::size_t number = 1; lines.Next(); ++number)
        if (!IsBlank(lines) && !delivery.Deliver(number, lines))
            break;
    delivery.AwaitRefusal();
    if (lines.HasFailed()) {
        TellError("", "what was to be sent could not be read to its end");
        delivery.Close();
        return 1;
    }
    return delivery.Close();
}

} // namespace reportctl::send
