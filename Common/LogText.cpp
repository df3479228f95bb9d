#include "Common/LogText.h"

#include <algorithm>
#include <locale>
#include <memory>
#include <string_view>

namespace SyncServiceReport {
namespace {

/// The numbers in a directive: argument, width and precision. boost::format calculates with them unchecked,
/// beyond the range of its integers.
class NumbersOfDirective {
public:
    /// `begin` is the place after the percent sign.
    NumbersOfDirective(const std::string& format, std::size_t begin) : m_format(format), m_at(begin) {}

    /// Throws std::length_error when a number has more than nine digits. No text within the size limits needs
    /// such a number.
    void Check() {
        Skip('|');
        const bool isNumbered = Next() != '0' && SkipNumber(); // a zero here is a flag
        if (isNumbered && Next() == '%')
            return;
        if (!isNumbered || Skip('$')) { // without a dollar sign, the number was the width
            SkipFlags();
            SkipNumberOrAsterisk();
        }
        if (Skip('.'))
            SkipNumberOrAsterisk();
    }

private:
    static constexpr std::size_t MAX_DIGITS = 9;

    char Next() const { return m_format[m_at]; } // a zero byte after the last character

    bool Skip(char character) {
        const bool isNext = Next() == character;
        m_at += isNext ? 1 : 0;
        return isNext;
    }

    // Compared one by one: a search in a text would take half of the whole time.
    static bool IsFlag(char character) {
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

/// A text that is being built. Beyond its limit, bytes are no longer kept and only counted, so that the error
/// can say how long the text would have become.
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

/// Gives the text that boost::format gives without arguments: it reads each directive with Boost's own
/// function and reports the same errors. boost::format itself is not used, for two reasons. It keeps an item
/// for each directive, which takes a tenth of a millisecond for a datagram full of directives. And it counts
/// the directives first, to make room for the items, but counts one too few for a tabulation whose fill is a
/// percent sign (`%1T%%|9t|`). Parsing then writes beyond the end of its array, and such a datagram could end
/// the service.
class OutsideFormat {
public:
    explicit OutsideFormat(const std::string& format)
        : m_format(format), m_text(std::min(format.size() + MAX_LOG_TEXT_GROWTH_BYTES, MAX_LOG_TEXT_BYTES)) {}

    std::string Text() {
        // Called for its errors only: it refuses every text that ends in a percent sign, also in a doubled
        // one.
        boost::io::detail::upper_bound_from_fstring(m_format, '%', m_characters, boost::io::all_error_bits);
        ReadAll();
        // Directives with and without an argument number cannot be mixed.
        if (m_takesNext && m_highestArgument >= 0)
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
            if (m_format[sign + 1] == '%') { // after the last character is a zero byte
                m_text.Append("%");
                begin = sign + 2;
            } else {
                begin = ReadDirective(sign + 1);
            }
        }
        m_text.Append(std::string_view(m_format).substr(begin));
    }

    /// Reads the directive that begins at `begin`. Returns the place after the directive.
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
            return; // the next directive keeps what this one set, as in boost::format
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
    bool m_takesNext = false; ///< Whether a directive takes the next argument.
    /// The highest number among directives that name their argument, from 0; -1: none.
    int m_highestArgument = -1;
};

} // namespace

std::string BuildLogText(const std::string& format) {
    return OutsideFormat(format).Text();
}

} // namespace SyncServiceReport
