#pragma once

#include <curl/curl.h>

namespace MetrikSdk::otlp {

/// The functions of libcurl that we call. The names are libcurl's, without "curl_".
///
/// Curl opens the library at its first call; the library then stays open. We do not link libcurl, because
/// most services have no collector. libcurl loads some thirty more libraries, for TLS, Kerberos and LDAP
/// among others. Together they were a third of the resident memory of a service without a collector.
struct CurlLibrary {
    decltype(&::curl_easy_cleanup) easy_cleanup;
    decltype(&::curl_easy_getinfo) easy_getinfo;
    decltype(&::curl_easy_init) easy_init;
    decltype(&::curl_easy_setopt) easy_setopt;
    decltype(&::curl_easy_strerror) easy_strerror;
    decltype(&::curl_easy_unescape) easy_unescape;
    decltype(&::curl_free) free;
    decltype(&::curl_getdate) getdate;
    decltype(&::curl_global_init) global_init;
    decltype(&::curl_multi_add_handle) multi_add_handle;
    decltype(&::curl_multi_cleanup) multi_cleanup;
    decltype(&::curl_multi_info_read) multi_info_read;
    decltype(&::curl_multi_init) multi_init;
    decltype(&::curl_multi_perform) multi_perform;
    decltype(&::curl_multi_poll) multi_poll;
    decltype(&::curl_multi_remove_handle) multi_remove_handle;
    decltype(&::curl_slist_append) slist_append;
    decltype(&::curl_slist_free_all) slist_free_all;
    decltype(&::curl_url) url;
    decltype(&::curl_url_cleanup) url_cleanup;
    decltype(&::curl_url_get) url_get;
    decltype(&::curl_url_set) url_set;
    decltype(&::curl_version) version;
};

/// Returns the library's functions. Threads: any. Failure: std::runtime_error with the system's reason when
/// the library cannot be opened; the next call tries again.
const CurlLibrary& Curl();

} // namespace MetrikSdk::otlp
