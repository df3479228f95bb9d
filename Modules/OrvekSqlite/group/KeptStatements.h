#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace OrvekSqlite::group {

/// The texts of statements in their order, all in one block of memory. So keeping a text takes a copy of its
/// bytes and no allocation.
class KeptStatements {
public:
    bool IsEmpty() const { return m_ends.empty(); }
    std::size_t Count() const { return m_ends.size(); }
    std::size_t Bytes() const { return m_texts.size(); }

    /// Makes room for one more text, so that Add does not fail after the statement was run.
    void Reserve(const std::string& sql) {
        if (m_texts.capacity() < m_texts.size() + sql.size())
            m_texts.reserve(2 * (m_texts.size() + sql.size()));
        if (m_ends.capacity() == m_ends.size())
            m_ends.reserve(2 * m_ends.size() + 64);
    }

    void Add(const std::string& sql) {
        m_texts += sql;
        m_ends.push_back(m_texts.size());
    }

    std::string operator[](std::size_t index) const {
        return m_texts.substr(Start(index), m_ends[index] - Start(index));
    }

    void Remove(std::size_t index) {
        const auto length = m_ends[index] - Start(index);
        m_texts.erase(Start(index), length);
        m_ends.erase(m_ends.begin() + static_cast<std::ptrdiff_t>(index));
        for (auto i = index; i < m_ends.size(); ++i)
            m_ends[i] -= length;
    }

    void Clear() {
        m_texts.clear();
        m_ends.clear();
        if (m_texts.capacity() > MAX_RESERVE)
            m_texts.shrink_to_fit();
    }

private:
    /// After a group of unusually long texts, memory over this is given back.
    static constexpr std::size_t MAX_RESERVE = 1'048'576;

    std::size_t Start(std::size_t index) const { return index == 0 ? 0 : m_ends[index - 1]; }

    std::string m_texts;
    std::vector<std::size_t> m_ends; ///< the end of each text in m_texts
};

} // namespace OrvekSqlite::group
