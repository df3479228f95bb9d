#pragma once

#include <cstdint>
#include <cstdio>
#include <stdexcept>
#include <string>

#include "bench/Report.h"

/// The report of 180 bytes with its number in `createTime`, which becomes part of the stored row. To write a
/// number changes some bytes in place, so it adds almost nothing to a measured loop.
class NumberedReport {
public:
    /// `eventId` must be as long as the usual one, so that all reports have 180 bytes.
    explicit NumberedReport(const std::string& eventId) : m_text(ReportOf180Bytes()) {
        const std::string usual = "B100|10001";
        if (eventId.size() != usual.size() || m_text.size() != 180)
            throw std::invalid_argument("the report would not have 180 bytes");
        m_text.replace(m_text.find(usual), usual.size(), eventId);
        m_number = m_text.find(FIRST_TIME) + std::string(FIRST_TIME).size();
    }

    /// The text with that number.
    const std::string& Text(std::int64_t number) {
        auto digit = m_text.begin() + static_cast<std::ptrdiff_t>(m_number);
        for (int i = 0; i < DIGITS; ++i, number /= 10)
            *--digit = static_cast<char>('0' + number % 10);
        return m_text;
    }

private:
    static constexpr auto FIRST_TIME = "1700000000123";
    /// At the end of the time: billions of numbers fit without changing its length.
    static constexpr int DIGITS = 10;

    std::string m_text;
    std::size_t m_number; ///< the place after the last digit
};
