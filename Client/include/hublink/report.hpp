#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>

#if defined(__GNUC__)
#define HUBLINK_EXPORT __attribute__((visibility("default")))
#else
#define HUBLINK_EXPORT
#endif

/// Sends usage reports to the report service of the HubLink suite on this machine.
///
///     hublink::Reporter reporter(hublink::Module{"A100", "2.1", "Painter"});
///     reporter.Event("A100|10001", hublink::Json{R"({"clicks":3})"});
///     reporter.Event("B100|10001", "it's a text as it is");
///
/// An event whose id begins with a capital A goes to analytics. Any other event goes to the user's local
/// store. A text arrives in the store exactly as it was given, with any characters; JSON arrives as the same
/// value.
namespace hublink {

/// What happened to an event, or to a user that was set. The library has the same names in C and in Python.
enum class Result {
    /// The system took the datagram, and a program listens on the service's port. The library knows no more,
    /// because the service does not answer. Linux drops a datagram without an error when the listener's
    /// receive buffer is full: after some thousand reports that come faster than the service reads them. When
    /// an announcement is dropped, the module's events of the next second can be lost, too; see Reporter.
    Sent,
    /// No service runs. The event is lost: the library keeps nothing for later. The next event tries again.
    NobodyListens,
    /// The datagram would have more than 10240 bytes. Characters that must be escaped count as escaped.
    TooLong,
    /// A text (an event's, a user's or the module's) is not UTF-8, or it has a zero character in it; or an
    /// open id is empty.
    InvalidText,
    /// A value that was given as Json is not JSON; half a surrogate pair, as in "\ud800", is not JSON either.
    /// Or the value of an event for analytics is given, but is not an object that the service can read: at
    /// most 127 levels, integers of at most 64 bits, other numbers within the range of a double.
    InvalidJson,
    /// The event id is empty, is not UTF-8 or has a zero character in it. Or it begins with a capital A, but
    /// has no bar, or the module before the bar is neither this reporter's module nor "A759".
    InvalidEventId,
    /// An open id or a suite version has a single quote in it. The store needs a quote written twice, and
    /// analytics needs it written once, so no text would be right for both.
    QuoteInUser,
    /// The service that listens runs for another user and would put the report into that user's store. See
    /// Options.
    OtherUsersService,
    /// The system's send buffer is full.
    WouldBlock,
    /// Any other reason, such as no memory, no free descriptor or a firewall. Without a free descriptor, the
    /// library cannot see whose service it is, so it sends nothing to a service that it has not seen before.
    SystemError,
};

/// The result's name, such as "NobodyListens"; "Unknown" for a value that is not in the list.
[[nodiscard]] HUBLINK_EXPORT const char* ToString(Result result) noexcept;

/// A program of the suite that reports to analytics. Its event ids begin with the module's id and a bar, so
/// the module's id begins with a capital A. The service keeps the first 64 bytes of the id, and the first 256
/// bytes of the version and of the name.
struct Module {
    std::string id = {};
    std::string version = {};
    std::string name = {};
};

struct Options {
    /// A machine runs one service, for one user. By default, a program of another user does not report to it,
    /// because the reports would end in a store that is not its user's: calls return OtherUsersService. Set
    /// this to true to report all the same. The library can see whose service it is on Linux only. On other
    /// systems it always reports.
    bool allowOtherUsersService = false;
};

/// A text that is JSON. It is checked when the event is sent. It refers to the text and does not own it.
struct Json {
    std::string_view text;
};

/// The value of an event: nothing, a text, or JSON. It refers to the text and does not own it: the text must
/// live until Reporter::Event has returned.
class Value {
public:
    enum class Kind { Nothing, Text, Json };

    constexpr Value() noexcept = default;
    constexpr Value(std::nullopt_t) noexcept {}
    constexpr Value(std::string_view text) noexcept : m_kind(Kind::Text), m_text(text) {}
    /// A null pointer means no value.
    constexpr Value(const char* text) noexcept
        : m_kind(text == nullptr ? Kind::Nothing : Kind::Text),
          m_text(text == nullptr ? std::string_view() : std::string_view(text)) {}
    Value(const std::string& text) noexcept : m_kind(Kind::Text), m_text(text) {}
    constexpr Value(hublink::Json json) noexcept : m_kind(Kind::Json), m_text(json.text) {}

    /// A number does not compile, because it can be written in several ways: give hublink::Json{"1.5"}, or a
    /// text. Without this, a literal 0 would be a null pointer and so mean no value.
    template <typename Number, typename = std::enable_if_t<std::is_arithmetic_v<Number>>>
    Value(Number) = delete;

    [[nodiscard]] constexpr Kind WhatItIs() const noexcept { return m_kind; }
    [[nodiscard]] constexpr std::string_view Text() const noexcept { return m_text; }

private:
    Kind m_kind = Kind::Nothing;
    std::string_view m_text;
};

/// Sends events, each as one datagram. A reporter has a socket of its own.
///
/// Announcements: the service must know a module before the module's first event. It forgets modules and user
/// when it ends. The reporter announces its module before the module's first event, and it announces the user
/// that was set. After the service was gone or was restarted, it announces both again before the next event.
/// When no event was sent between the service's end and its new start, the reporter finds the restart by the
/// service's socket in /proc/net/udp. It looks there once a second while events are sent; events of that
/// second can get lost. There it also sees that Linux dropped datagrams to the service. An announcement may
/// be among them, so the reporter announces everything again. In any case, and on every system, it announces
/// everything again every three minutes while events are sent. A second announcement does no harm. But two
/// programs should not set different users, because each repeats its own.
///
/// Threads: any thread may call at any time. Threads wait for each other only while one of them hands a
/// datagram to the system or looks for the service's socket. The library starts no thread.
///
/// Fork: a reporter may be used in the child, where it opens a socket of its own. Some programs close all
/// descriptors that they do not know, and so the reporter's socket, too. The reporter opens another socket
/// when a call shows that its own was closed. When the program has opened a socket that got the closed one's
/// number, the reporter notices it once a second; before that, its datagrams go into the program's socket. It
/// never closes what the program opened.
///
/// Failure: no call throws, blocks or writes to the terminal. When there was no memory to make the reporter,
/// Event and SetUser return SystemError.
class Reporter {
public:
    using Time = std::chrono::system_clock::time_point;

    /// Makes a reporter for the local store, and for the analytics module "A759", which the service knows
    /// from its start.
    HUBLINK_EXPORT Reporter() noexcept;

    /// Makes a reporter for the same, and for the program's own module. The module is copied.
    HUBLINK_EXPORT explicit Reporter(const Module& module, const Options& options = {}) noexcept;

    HUBLINK_EXPORT ~Reporter();
    Reporter(const Reporter&) = delete;
    Reporter& operator=(const Reporter&) = delete;

    /// Reports that something happened.
    ///
    /// `value`: for the store nothing, a text, or JSON of any kind; a text is stored byte for byte, and JSON
    /// without white space. For analytics nothing, or a JSON object, in which the service itself sets the
    /// members "openid" and "sys_version".
    /// `time`: when it happened, in milliseconds; without it, now. (The service takes a time of ten digits
    /// for seconds. So a time of ten digits in milliseconds, in some months of 1970, is sent and stored with
    /// a zero in front.)
    /// `isDayReport`: whether the event is a report about a day.
    HUBLINK_EXPORT Result Event(std::string_view eventId, Value value = {},
                                std::optional<Time> time = std::nullopt, bool isDayReport = false) noexcept;

    /// Tells the service who is signed in, and the version of the suite. The service adds both to every later
    /// report, also to those of other programs, because it knows one user only. With an empty version, the
    /// service keeps the version that it knows; a service that was restarted is told the last version that
    /// was given here and not empty. The message is sent at once. When a text in it cannot be sent
    /// (InvalidText, QuoteInUser, TooLong), nothing changes. When the system does not take the message now,
    /// it is sent before the next event.
    HUBLINK_EXPORT Result SetUser(std::string_view openId, std::string_view suiteVersion = {}) noexcept;

    /// How many calls of Event and SetUser returned this result.
    [[nodiscard]] HUBLINK_EXPORT std::uint64_t Count(Result result) const noexcept;

private:
    class Inside;
    std::unique_ptr<Inside> m_inside; ///< Null when there was no memory.
};

} // namespace hublink
