#pragma once

#include <iostream>
#include <mutex>
#include <streambuf>
#include <string>

/// Captures standard output while this object exists. Different threads may write and read it.
class CapturedOutput : private std::streambuf {
public:
    CapturedOutput() : m_original(std::cout.rdbuf(this)) {}
    ~CapturedOutput() override { std::cout.rdbuf(m_original); }
    CapturedOutput(const CapturedOutput&) = delete;
    CapturedOutput& operator=(const CapturedOutput&) = delete;

    std::string Text() const {
        const std::lock_guard lock(m_mutex);
        return m_text;
    }

    /// How often the output was flushed.
    int Flushes() const {
        const std::lock_guard lock(m_mutex);
        return m_flushes;
    }

private:
    int sync() override {
        const std::lock_guard lock(m_mutex);
        ++m_flushes;
        return 0;
    }
    std::streamsize xsputn(const char* text, std::streamsize length) override {
        const std::lock_guard lock(m_mutex);
        m_text.append(text, static_cast<std::size_t>(length));
        return length;
    }
    int overflow(int character) override {
        const char byte = static_cast<char>(character);
        xsputn(&byte, 1);
        return character;
    }

    mutable std::mutex m_mutex; ///< Guards the text and the number of flushes.
    std::string m_text;
    int m_flushes = 0;
    std::streambuf* m_original;
};
