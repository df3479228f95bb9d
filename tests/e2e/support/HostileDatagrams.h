#pragma once

#include <string>
#include <vector>

// Datagrams as an attacker may write them to do harm, sorted by the kind of harm.
namespace Hostile {

using Datagrams = std::vector<std::string>;

/// Makes user and suite version valid again. The texts of a sign-in are in the statement of each later row,
/// unescaped by design. So a text with a quote in it stops the store until the next sign-in.
inline const std::string SOUND_SIGN_IN =
    R"({"msgType":"updateOpenID","exdata":{"openID":"u1","hublinkVersion":"5.1.0.2"}})";

/// Puts `text` unchanged between the quotes of a JSON text, into every field that the service reads:
/// six reports for the store (id, value, a member of the value, time, day mark, a member that is ignored);
/// five reports for analytics (id, value, a member of the value, time, and an id without a module);
/// the control messages, each followed by a valid sign-in; six of them announce a module, which then sends an
/// event.
/// The valid ones among these give two to six rows, and up to nine events.
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
