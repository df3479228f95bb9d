#pragma once

#include <string>
#include <string_view>

/// Text in the language of manual pages.
namespace reportctl::pages::mdoc {

/// Words for a macro's line: no word is taken for a macro, no character for an instruction.
std::string Words(std::string_view text);

/// Paragraphs, one sentence a line. Lines that are indented, such as examples, stay as they are.
std::string Paragraphs(std::string_view text);

/// The text up to the end of its first sentence, without the full stop.
std::string FirstSentence(std::string_view text);

} // namespace reportctl::pages::mdoc
