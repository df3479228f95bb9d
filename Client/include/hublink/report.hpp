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
/// An event whose id begins with a capital A goes to analytics, any other to the user's local store. A text
/// arrives in the store exactly as it was given, with any characters; JSON arrives as the same value.
namespace hublink {

/// What happened to an event, or to a user that was set. The same names as in C and in Python.
enum class Result {
    /// The system took it, and a program listens on the service's port. No more is known: there is no answer.
    /// Linux drops a datagram silently when the listener's buffer is full, after some thousand reports that
    /// come faster than the service reads them.
    Sent,
    /// The service does not run. The event is lost; nothing is kept for later. The next event tries again.
    NobodyListens,
    /// Its datagram would have more than 10240 bytes, with everything escaped that must be.
    TooLong,
    /// The text is no UTF-8 or has a zero character in it; or an open id is empty.
    InvalidText,
    /// What was given as Json is none (half a surrogate pair, as in "\ud800", is none either); or an event
    /// for analytics has a value that is neither nothing nor an object which the service can read: at most
    /// 127 levels, integers of at most 64 bits, numbers within the range of a double.
    InvalidJson,
    /// The event id is empty, is no UTF-8 or has a zero character in it; or it begins with a capital A and
    /// has no bar, or a module before the bar that is neither this reporter's nor "A759".
    InvalidEventId,
    /// A single quote in an open id or a suite version. No spelling of it is right for both the store and
    /// analytics.
    QuoteInUser,
    /// The service that listens runs for another user, whose store would get the report. See Options.
    OtherUsersService,
    /// The system's send buffer is full.
    WouldBlock,
    /// Anything else: no memory, no descriptor, a firewall.
    SystemError,
};

/// The result's name, such as "NobodyListens". For a value that is none of the above, "Unknown".
[[nodiscard]] HUBLINK_EXPORT const char* ToString(Result result) noexcept;

/// A program of the suite that reports to analytics. The id is what stands before the bar in its event ids,
/// and so begins with a capital A. The service keeps 64 bytes of the id and 256 of the others.
struct Module {
    std::string id = {};
    std::string version = {};
    std::string name = {};
};

struct Options {
    /// One service runs on a machine, for one user. Without this, a program of another user does not report
    /// to it: its user's reports would end in a store that is not theirs. Known on Linux only; elsewhere as
    /// if it were true.
    bool allowOtherUsersService = false;
};

/// A text that is JSON. It is checked when it is sent.
struct Json {
    std::string_view text;
};

/// What there is to say about an event: nothing, a text, or JSON. Refers to the text and does not own it.
class Value {
public:
    enum class Kind { Nothing, Text, Json };

    constexpr Value() noexcept = default;
    constexpr Value(std::nullopt_t) noexcept {}
    constexpr Value(std::string_view text) noexcept : m_kind(Kind::Text), m_text(text) {}
    /// A null pointer is nothing.
    constexpr Value(const char* text) noexcept
        : m_kind(text == nullptr ? Kind::Nothing : Kind::Text),
          m_text(text == nullptr ? std::string_view() : std::string_view(text)) {}
    Value(const std::string& text) noexcept : m_kind(Kind::Text), m_text(text) {}
    constexpr Value(hublink::Json json) noexcept : m_kind(Kind::Json), m_text(json.text) {}

    /// A number has no one text: hublink::Json{"1.5"}, or a text. Else 0 would be a null pointer, and so
    /// nothing.
    template <typename Number, typename = std::enable_if_t<std::is_arithmetic_v<Number>>>
    Value(Number) = delete;

    [[nodiscard]] constexpr Kind WhatItIs() const noexcept { return m_kind; }
    [[nodiscard]] constexpr std::string_view Text() const noexcept { return m_text; }

private:
    Kind m_kind = Kind::Nothing;
    std::string_view m_text;
};

/// Sends events, each as one datagram over one socket of its own.
///
/// Announcements: the service must know a module before its first event, and forgets module and user when it
/// ends. The reporter announces its module before the module's first event, and the user that was set, and
/// does it again when the service was found gone or was restarted. A restart that no event fell into is
/// noticed within a second of events, by the service's socket in /proc/net/udp; where there is no such file,
/// everything is announced again every three minutes.
///
/// Threads: any thread, at any time. Threads wait for each other only while one of them hands a datagram to
/// the system. There is no thread of the library's own.
///
/// Fork: safe in the child, which gets a socket of its own. A program that closes descriptors that it does
/// not know, except between fork and exec, closes the reporter's, too; the reporter opens another one when it
/// notices.
///
/// Failure: nothing throws, blocks or writes to the terminal. A reporter for which there was no memory
/// answers every call with SystemError.
class Reporter {
public:
    using Time = std::chrono::system_clock::time_point;

    /// For the local store, and for the analytics module "A759", which is there from the start.
    HUBLINK_EXPORT Reporter() noexcept;

    /// For these and for a module of the program's own, which is copied.
    HUBLINK_EXPORT explicit Reporter(const Module& module, const Options& options = {}) noexcept;

    HUBLINK_EXPORT ~Reporter();
    Reporter(const Reporter&) = delete;
    Reporter& operator=(const Reporter&) = delete;

    /// Reports that something happened.
    ///
    /// `value`: for the store a text, which is stored byte for byte, or JSON of any kind, which is stored
    /// without white space; for analytics nothing, or JSON of an object. Of that, the service sets the
    /// members "openid" and "sys_version" itself.
    /// `time`: when it happened, to the millisecond; without it, now. (Times of a few months of 1970, whose
    /// milliseconds have ten digits and would be taken for seconds, are stored with a zero in front.)
    /// `isDayReport`: whether it is a report about a day.
    HUBLINK_EXPORT Result Event(std::string_view eventId, Value value = {},
                                std::optional<Time> time = std::nullopt, bool isDayReport = false) noexcept;

    /// Tells who is signed in, and the version of the suite, which go with every report that comes after; of
    /// all programs, since the service has one user. An empty version leaves the one that is known. It is
    /// sent at once; what could not be sent for another reason than its own text is sent before the next
    /// event.
    HUBLINK_EXPORT Result SetUser(std::string_view openId, std::string_view suiteVersion = {}) noexcept;

    /// How many calls of Event and SetUser ended so.
    [[nodiscard]] HUBLINK_EXPORT std::uint64_t Count(Result result) const noexcept;

private:
    class Inside;
    std::unique_ptr<Inside> m_inside; ///< Null when there was no memory.
};

} // namespace hublink
