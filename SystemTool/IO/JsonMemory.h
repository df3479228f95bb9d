#pragma once

#include <cstddef>
#include <cstring>
#include <new>

#include <rapidjson/document.h>
#include <rapidjson/reader.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

// RapidJSON's classes with memory of our own. Its own allocators return null when there is none, and nothing
// in the library looks at that: a report that met the end of the memory ended the process. Use these names,
// and not the library's.
namespace SystemTool::IO {

/// Throws std::bad_alloc, and no call returns without the memory that was asked for.
class JsonAllocator {
public:
    static const bool kNeedFree = true; // the library's name: Free must be called

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
