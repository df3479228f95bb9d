#pragma once

#include <string>
#include <string_view>

/// Writes text in mdoc, the language of manual pages.
namespace reportctl::pages::mdoc {

/// Words for the line of a macro. They are escaped so that no word is taken for a macro and no character for
/// an instruction.
std::string Words(std::string_view text);

/// Paragraphs in which each sentence begins a line. Indented lines, such as examples, stay as they are.
std::string Paragraphs(std::string_view text);

/// The text up to the end of its first sentence, without the full stop.
std::string FirstSentence(std::string_view text);

} // namespace reportctl::pages::mdoc
