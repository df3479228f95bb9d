# The build step of ssr_embed_file.
file(READ ${FILE} bytes HEX)
string(REGEX REPLACE "([0-9a-f][0-9a-f])" "'\\\\x\\1'," bytes "${bytes}")
file(WRITE ${SOURCE} "#include <string_view>
namespace embedded {
std::string_view ${NAME}();
std::string_view ${NAME}() {
    static constexpr char BYTES[] = {${bytes}};
    return {BYTES, sizeof BYTES};
}
} // namespace embedded
")
