#pragma once

#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include <curl/curl.h>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/otlp/Secrets.h"
#include "Modules/MetrikSdk/otlp/Sender.h"

namespace MetrikSdk::otlp {

/// Posts over HTTP. The connection is kept between requests. TLS certificates are verified. Redirects are not
/// followed. Only http and https are used. The proxies of the standard variables are used. At most 64 KiB of
/// an answer's body are read. Results hold no value of a configured header, because people get to see them.
///
/// Threads: any may call Abandon. All other functions: one thread at a time.
class HttpSender : public Sender {
public:
    explicit HttpSender(EndpointConfig config);

    HttpResult Post(const std::string& body) override;
    void Abandon() override { m_abandoned = true; }
    std::string Destination() const override { return WithoutSecrets(m_config.url); }
    std::vector<std::string> HeaderNames() const override;
    VariableNames Variables() const override { return m_config.variables; }

    /// Ends every request of the process, and lets no new one begin. Waits until no request is running, but
    /// at most `patience`. exit() needs this before the TLS library destroys its state, which must not be in
    /// use then. (When the caller is a thread that crashed within a request, it waits in vain.)
    static void AbandonAll(std::chrono::milliseconds patience);

private:
    struct Answer {
        HttpResult result;
        bool headersEnded = false;
        bool cut = false; ///< The body was longer than the part that is read.
    };

    void Configure();
    void ConfigureTls();
    void ConfigureHeaders();
    void AddHeader(const std::string& line);
    CURLcode Perform();
    bool MustEnd() const;
    HttpResult Finish(CURLcode code, Answer& answer);

    static std::size_t OnBody(char* bytes, std::size_t size, std::size_t count, void* data);
    static std::size_t OnHeader(char* bytes, std::size_t size, std::size_t count, void* data);

    const EndpointConfig m_config;
    const Secrets m_secrets;
    std::atomic<bool> m_abandoned = false;
    std::unique_ptr<curl_slist, decltype(&::curl_slist_free_all)> m_headers;
    std::unique_ptr<CURLM, decltype(&::curl_multi_cleanup)> m_multi; ///< Keeps the connection.
    std::unique_ptr<CURL, decltype(&::curl_easy_cleanup)> m_easy;
    char m_error[CURL_ERROR_SIZE] = "";
};

} // namespace MetrikSdk::otlp
