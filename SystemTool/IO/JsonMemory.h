#pragma once

#include <cstddef>
#include <cstring>
#include <new>
#include <string_view>

#include <rapidjson/document.h>
#include <rapidjson/reader.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

// RapidJSON's classes with an allocator of our own. The library's allocators return null when there is no
// memory, and nothing in the library checks for null: a report that ran out of memory ended the process. Use
// these names, not the library's.
namespace SystemTool::IO {

/// Throws std::bad_alloc when there is no memory. A call that returns has given the memory that was asked
/// for.
class JsonAllocator {
public:
    static const bool kNeedFree = true; // a name that the library reads: it must call Free

    void* Malloc(std::size_t bytes) { return bytes == 0 ? nullptr : ::operator new(bytes); }

    void* Realloc(void* memory, std::size_t oldBytes, std::size_t newBytes) {
        void* const moved = Malloc(newBytes);
        if (memory != nullptr && moved != nullptr)
            std::memcpy(moved, memory, oldBytes < newBytes ? oldBytes : newBytes);
        Free(memory);
        return moved;
    }

    static void Free(void* memory) noexcept { ::operator delete(memory); }
};

using JsonPool = rapidjson::MemoryPoolAllocator<JsonAllocator>;
using JsonValue = rapidjson::GenericValue<rapidjson::UTF8<>, JsonPool>;
using JsonTree = rapidjson::GenericDocument<rapidjson::UTF8<>, JsonPool, JsonAllocator>;
using JsonReader = rapidjson::GenericReader<rapidjson::UTF8<>, rapidjson::UTF8<>, JsonAllocator>;
using JsonBuffer = rapidjson::GenericStringBuffer<rapidjson::UTF8<>, JsonAllocator>;

/// Copies a text that needs no escapes as a whole. The library's own writer copies byte by byte, which took
/// half of the time for writing an event.
class JsonWriter : public rapidjson::Writer<JsonBuffer, rapidjson::UTF8<>, rapidjson::UTF8<>, JsonAllocator> {
public:
    explicit JsonWriter(JsonBuffer& buffer) : Writer(buffer) {}

    bool String(const char* text, rapidjson::SizeType length, bool /*copy*/ = false) {
        Prefix(rapidjson::kStringType);
        return EndValue(IsPlain({text, length}) ? Copy(text, length) : WriteString(text, length));
    }
    bool Key(const char* text, rapidjson::SizeType length, bool copy = false) {
        return String(text, length, copy);
    }
    bool Key(const char* text) { return Key(text, static_cast<rapidjson::SizeType>(std::strlen(text))); }

private:
    static constexpr std::size_t BLOCK = 16;

    static bool IsPlain(std::string_view text) {
        for (; text.size() >= BLOCK; text.remove_prefix(BLOCK))
            if (!IsPlain(text.data(), BLOCK)) // a constant length, so the compiler uses vector instructions
                return false;
        return IsPlain(text.data(), text.size());
    }

    static bool IsPlain(const char* text, std::size_t length) {
        unsigned char odd = 0;
        for (std::size_t i = 0; i < length; ++i) {
            const auto byte = static_cast<unsigned char>(text[i]);
            odd = static_cast<unsigned char>(odd | (byte < 0x20) | (byte == '"') | (byte == '\\'));
        }
        return odd == 0;
    }

    bool Copy(const char* text, rapidjson::SizeType length) {
        char* const to = os_->Push(length + 2U);
        to[0] = '"';
        std::memcpy(to + 1, text, length);
        to[length + 1U] = '"';
        return true;
    }
};

} // namespace SystemTool::IO
