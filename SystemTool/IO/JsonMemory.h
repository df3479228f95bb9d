#pragma once

#include <cstddef>
#include <cstring>
#include <new>

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
using JsonWriter = rapidjson::Writer<JsonBuffer, rapidjson::UTF8<>, rapidjson::UTF8<>, JsonAllocator>;

} // namespace SystemTool::IO
