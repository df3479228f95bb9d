#include "Modules/MetrikSdk/otlp/Gzip.h"

#include <new>

#include <zlib.h>

namespace MetrikSdk::otlp {
namespace {

constexpr int GZIP_WINDOW_BITS = 15 + 16; // the largest window; 16 more asks for gzip's header and not zlib's
constexpr int DEFAULT_MEMORY_LEVEL = 8;

class Deflater {
public:
    Deflater() {
        if (::deflateInit2(&m_stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, GZIP_WINDOW_BITS,
                           DEFAULT_MEMORY_LEVEL, Z_DEFAULT_STRATEGY) != Z_OK)
            throw std::bad_alloc(); // the only failure that the constants above leave
    }
    ~Deflater() { ::deflateEnd(&m_stream); }
    Deflater(const Deflater&) = delete;
    Deflater& operator=(const Deflater&) = delete;

    std::string Run(const std::string& text) {
        std::string result(::deflateBound(&m_stream, text.size()), '\0');
        m_stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
        m_stream.avail_in = static_cast<uInt>(text.size());
        m_stream.next_out = reinterpret_cast<Bytef*>(result.data());
        m_stream.avail_out = static_cast<uInt>(result.size());
        ::deflate(&m_stream, Z_FINISH); // ends in one call, because the bound holds
        result.resize(m_stream.total_out);
        return result;
    }

private:
    z_stream m_stream{};
};

} // namespace

std::string Gzip(const std::string& text) {
    return Deflater().Run(text);
}

} // namespace MetrikSdk::otlp
