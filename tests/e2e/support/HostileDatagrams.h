#pragma once

#include <string>
#include <vector>

// Datagrams that an attacker wrote to do harm, by the kind of harm.
namespace Hostile {

using Datagrams = std::vector<std::string>;

/// Makes user and version valid again. The text of a sign-in stands in the statement of each later row,
/// unescaped by design, so one with a quote in it stops the store until the next sign-in.
inline const std::string SOUND_SIGN_IN =
    R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":"5.1.0.2"}})";

/// `text`, which is put between a JSON text's quotes as it is, in every field that the service reads: six
/// reports for the store (in id, value, a member of the value, time, day mark, a member that is ignored),
/// five for analytics (in id, value, a member, time, and an id without a module), and the control messages, a
/// sound sign-in behind each; six of them begin a module, which then has an event. What is sound of that: two
/// to six rows, and up to nine events.
Datagrams InEveryField(const std::string& text);
Datagrams InEveryField(const std::vector<std::string>& texts);

Datagrams Brackets();
Datagrams DeepNesting();
Datagrams NestingAtTheLimit();
Datagrams InvalidUtf8();
Datagrams ZeroCharacters();
Datagrams HugeNumbers();
Datagrams NumbersThatVanish();
Datagrams DuplicateAndEmptyKeys();
Datagrams LongestDatagrams();
Datagrams Directives();
Datagrams DirectivesInReports();
Datagrams ForgedRecords();
Datagrams EscapedForgedRecords();
Datagrams TerminalEscapes();
Datagrams Sql();
Datagrams SqlThatFits();

} // namespace Hostile
