#include "Modules/MetrikSdk/otlp/CurlLibrary.h"

#include <stdexcept>
#include <string>

#include <dlfcn.h>

namespace MetrikSdk::otlp {
namespace {

#ifdef __APPLE__
constexpr auto FILE_NAME = "libcurl.4.dylib";
#else
constexpr auto FILE_NAME = "libcurl.so.4";
#endif

[[noreturn]] void Fail() {
    const char* const reason =
        ::dlerror(); // NOLINT(concurrency-mt-unsafe): the C library keeps a text for each thread
    throw std::runtime_error(std::string("cannot use libcurl: ") + (reason != nullptr ? reason : FILE_NAME));
}

/// The library is never closed, because libraries that it loads have registered functions that run at the end
/// of the process.
void* Opened() {
    void* const library = ::dlopen(FILE_NAME, RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
    if (library == nullptr)
        Fail();
    return library;
}

template <typename Function>
void Find(void* library, const char* name, Function& function) {
    void* const found = ::dlsym(library, name);
    if (found == nullptr)
        Fail();
    function = reinterpret_cast<Function>(found);
}

CurlLibrary Loaded() {
    void* const library = Opened();
    CurlLibrary curl{};
    const auto find = [library](const char* name, auto& function) { Find(library, name, function); };
    find("curl_easy_cleanup", curl.easy_cleanup);
    find("curl_easy_getinfo", curl.easy_getinfo);
    find("curl_easy_init", curl.easy_init);
    find("curl_easy_setopt", curl.easy_setopt);
    find("curl_easy_strerror", curl.easy_strerror);
    find("curl_easy_unescape", curl.easy_unescape);
    find("curl_free", curl.free);
    find("curl_getdate", curl.getdate);
    find("curl_global_init", curl.global_init);
    find("curl_multi_add_handle", curl.multi_add_handle);
    find("curl_multi_cleanup", curl.multi_cleanup);
    find("curl_multi_info_read", curl.multi_info_read);
    find("curl_multi_init", curl.multi_init);
    find("curl_multi_perform", curl.multi_perform);
    find("curl_multi_poll", curl.multi_poll);
    find("curl_multi_remove_handle", curl.multi_remove_handle);
    find("curl_slist_append", curl.slist_append);
    find("curl_slist_free_all", curl.slist_free_all);
    find("curl_url", curl.url);
    find("curl_url_cleanup", curl.url_cleanup);
    find("curl_url_get", curl.url_get);
    find("curl_url_set", curl.url_set);
    find("curl_version", curl.version);
    return curl;
}

} // namespace

const CurlLibrary& Curl() {
    static const CurlLibrary curl = Loaded();
    return curl;
}

} // namespace MetrikSdk::otlp
