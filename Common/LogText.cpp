#include "Common/LogText.h"

#include <algorithm>
#include <locale>
#include <memory>
#include <string_view>

namespace SyncServiceReport {
namespace {

/// The numbers in a directive: which argument, width and precision. boost::format computes with them
/// unchecked, beyond the range of its integers.
class NumbersOfDirective {
public:
    /// `begin` is behind the percent sign.
    NumbersOfDirective(const std::string& format, std::size_t begin) : m_format(format), m_at(begin) {}

    /// Throws std::length_error when one has more than nine digits, which no text within the size limits can
    /// have.
    void Check() {
        Skip('|');
        const bool isNumbered = Next() != '0' && SkipNumber(); // else a zero is a flag
        if (isNumbered && Next() == '%')
            return;
        if (!isNumbered || Skip('$')) { // else that was the width
            SkipFlags();
            SkipNumberOrAsterisk();
        }
        if (Skip('.'))
            SkipNumberOrAsterisk();
    }

private:
    static constexpr std::size_t MAX_DIGITS = 9;

    char Next() const { return m_format[m_at]; } // behind the last character, a zero

    bool Skip(char character) {
        const bool isNext = Next() == character;
        m_at += isNext ? 1 : 0;
        return isNext;
    }

    static bool IsFlag(char character) { // not a search in a text, which would take half of the time
        return character == '\'' || character == '-' || character == '=' || character == '_' ||
               character == ' ' || character == '+' || character == '0' || character == '#';
    }

    void SkipFlags() {
        while (IsFlag(Next()))
            ++m_at;
    }

    bool SkipNumber() {
        const auto begin = m_at;
        while (Skip('0')) {
        }
        const auto significant = m_at;
        while (Next() >= '0' && Next() <= '9')
            ++m_at;
        if (m_at - significant > MAX_DIGITS)
            throw std::length_error("a directive of the text has a number of more than 9 digits");
        return m_at > begin;
    }

    void SkipNumberOrAsterisk() {
        if (!Skip('*'))
            SkipNumber();
    }

    const std::string& m_format;
    std::size_t m_at;
};

/// A text on its way. Beyond its limit it only counts, so that the reason can say how long it would have
/// become.
class BoundedText {
public:
    explicit BoundedText(std::size_t limit) : m_limit(limit) {}

    void Append(std::string_view text) {
        m_bytes += text.size();
        if (m_bytes <= m_limit)
            m_text += text;
    }

    void FillTo(std::size_t column, char fill) {
        m_bytes = std::max(m_bytes, column);
        if (m_bytes <= m_limit)
            m_text.resize(m_bytes, fill);
    }

    std::size_t Bytes() const { return m_bytes; }
    bool IsWithinLimit() const { return m_bytes <= m_limit; }
    std::string Take() { return std::move(m_text); }

private:
    const std::size_t m_limit;
    std::size_t m_bytes = 0;
    std::string m_text;
};

/// boost::format for a text without arguments: the same reading of each directive, by the same function, and
/// the same errors. boost::format itself keeps an item for each directive, which takes a tenth of a
/// millisecond for a datagram of them; and it counts the directives before it makes room for the items, and
/// counts a tabulation whose fill is a percent sign (`%1T%%|9t|`) as one too few: parsing then writes behind
/// its array, and such a datagram could end the service.
class OutsideFormat {
public:
    explicit OutsideFormat(const std::string& format)
        : m_format(format), m_text(std::min(format.size() + MAX_LOG_TEXT_GROWTH_BYTES, MAX_LOG_TEXT_BYTES)) {}

    std::string Text() {
        // The count refuses every text that ends in a percent sign, also in a doubled one.
        boost::io::detail::upper_bound_from_fstring(m_format, '%', m_characters, boost::io::all_error_bits);
        ReadAll();
        if (m_takesNext && m_highestArgument >= 0) // the two ways to ask for arguments do not mix
            boost::throw_exception(
                boost::io::bad_format_string(static_cast<std::size_t>(m_highestArgument), 0));
        if (m_takesNext || m_highestArgument >= 0)
            boost::throw_exception(boost::io::too_few_args(0, 1));
        if (!m_text.IsWithinLimit())
            throw std::length_error("the text would grow from " + std::to_string(m_format.size()) + " to " +
                                    std::to_string(m_text.Bytes()) + " bytes, too many for a log record");
        return m_text.Take();
    }

private:
    using Item = boost::io::detail::format_item<char, std::char_traits<char>, std::allocator<char>>;

    void ReadAll() {
        std::size_t begin = 0;
        for (std::size_t sign = 0; (sign = m_format.find('%', begin)) != std::string::npos;) {
            m_text.Append({m_format.data() + begin, sign - begin});
            if (m_format[sign + 1] == '%') { // behind the last character is a zero
                m_text.Append("%");
                begin = sign + 2;
            } else {
                begin = ReadDirective(sign + 1);
            }
        }
        m_text.Append(std::string_view(m_format).substr(begin));
    }

    /// Where the text goes on behind the directive.
    std::size_t ReadDirective(std::size_t begin) {
        NumbersOfDirective(m_format, begin).Check();
        auto at = m_format.begin() + static_cast<std::ptrdiff_t>(begin);
        boost::io::detail::parse_printf_directive(at, m_format.end(), &m_item, m_characters, begin,
                                                  boost::io::all_error_bits);
        m_item.compute_states();
        Apply();
        return static_cast<std::size_t>(at - m_format.begin());
    }

    void Apply() {
        if (m_item.argN_ == Item::argN_ignored)
            return; // the next directive goes on with what this one set, as in boost::format
        if (m_item.argN_ == Item::argN_tabulation)
            m_text.FillTo(static_cast<std::size_t>(m_item.fmtstate_.width_), m_item.fmtstate_.fill_);
        else if (m_item.argN_ == Item::argN_no_posit)
            m_takesNext = true;
        else
            m_highestArgument = std::max(m_highestArgument, m_item.argN_);
        m_item.reset(' ');
    }

    const std::string& m_format;
    BoundedText m_text;
    const std::locale m_locale;
    const std::ctype<char>& m_characters = std::use_facet<std::ctype<char>>(m_locale);
    Item m_item{' '};
    bool m_takesNext = false;   ///< A directive takes the next argument.
    int m_highestArgument = -1; ///< Of the directives that name theirs, counted from 0.
};

} // namespace

std::string BuildLogText(const std::string& format) {
    return OutsideFormat(format).Text();
}

} // namespace SyncServiceReport
