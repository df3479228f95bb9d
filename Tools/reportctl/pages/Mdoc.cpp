#include "Tools/reportctl/pages/Mdoc.h"

#include <cctype>
#include <sstream>
#include <vector>

namespace reportctl::pages::mdoc {
namespace {

constexpr std::size_t LINE_LENGTH = 70; // escapes make a line longer, and mandoc warns from 80 on

bool IsUpper(char c) {
    return std::isupper(static_cast<unsigned char>(c)) != 0;
}

/// Escapes backslashes and hyphens. A backslash would begin an instruction. A bare hyphen may be shown as
/// another character, which a shell does not accept when a reader copies it.
std::string Escaped(std::string_view text) {
    std::string escaped;
    for (const char c : text) {
        if (c == '\\')
            escaped += "\\e";
        else if (c == '-')
            escaped += "\\-";
        else
            escaped += c;
    }
    return escaped;
}

/// A line of text, which mandoc must not take for a macro.
std::string Line(std::string_view text) {
    const bool looksLikeMacro = text.starts_with('.') || text.starts_with('\'');
    return (looksLikeMacro ? "\\&" : "") + Escaped(text) + "\n";
}

/// The position after the first sentence's full stop; npos when no other sentence follows.
std::size_t EndOfSentence(std::string_view text) {
    for (std::size_t i = 0; i + 2 < text.size(); ++i)
        if ((text[i] == '.' || text[i] == '!' || text[i] == '?') && text[i + 1] == ' ' &&
            IsUpper(text[i + 2]))
            return i + 1;
    return std::string_view::npos;
}

/// One sentence in short lines, so that people can also read the page's source.
std::string Wrapped(std::string_view text) {
    std::string lines;
    while (text.size() > LINE_LENGTH) {
        const auto space = text.rfind(' ', LINE_LENGTH);
        if (space == std::string_view::npos)
            break;
        lines += Line(text.substr(0, space));
        text.remove_prefix(space + 1);
    }
    return lines + (text.empty() ? "" : Line(text));
}

std::string Sentences(std::string_view text) {
    std::string lines;
    for (auto end = EndOfSentence(text); end != std::string_view::npos; end = EndOfSentence(text)) {
        lines += Wrapped(text.substr(0, end));
        text.remove_prefix(end + 1);
    }
    return lines + Wrapped(text);
}

bool IsIndented(std::string_view line) {
    return line.starts_with("  ");
}

using Lines = std::vector<std::string>;

std::string Literal(const Lines& lines, std::size_t& i) {
    std::string block = ".Bd -literal -offset indent\n";
    for (; i < lines.size() && IsIndented(lines[i]); ++i)
        block += Line(std::string_view(lines[i]).substr(2));
    return block + ".Ed\n";
}

std::string Filled(const Lines& lines, std::size_t& i) {
    std::string text;
    for (; i < lines.size() && !lines[i].empty() && !IsIndented(lines[i]); ++i)
        text += (text.empty() ? "" : " ") + lines[i];
    return Sentences(text);
}

Lines LinesOf(std::string_view text) {
    Lines lines;
    std::istringstream stream{std::string(text)};
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

} // namespace

std::string Words(std::string_view text) {
    std::string words;
    std::istringstream stream{std::string(text)};
    for (std::string word; stream >> word;) {
        const bool mayBeMacro = word.size() <= 3 && IsUpper(word.front());
        const bool mayBeDelimiter =
            word.size() == 1 && std::ispunct(static_cast<unsigned char>(word.front())) != 0;
        words += (words.empty() ? "" : " ");
        words += (mayBeMacro || mayBeDelimiter ? "\\&" : "") + Escaped(word);
    }
    return words;
}

std::string Paragraphs(std::string_view text) {
    const auto lines = LinesOf(text);
    std::string page;
    for (std::size_t i = 0; i < lines.size();) {
        if (lines[i].empty()) {
            ++i;
            continue;
        }
        const bool isLiteral = IsIndented(lines[i]);
        if (!page.empty() && !isLiteral)
            page += ".Pp\n";
        page += isLiteral ? Literal(lines, i) : Filled(lines, i);
    }
    return page;
}

std::string FirstSentence(std::string_view text) {
    auto sentence = std::string(text.substr(0, EndOfSentence(text)));
    if (sentence.ends_with('.'))
        sentence.pop_back();
    return sentence;
}

} // namespace reportctl::pages::mdoc
