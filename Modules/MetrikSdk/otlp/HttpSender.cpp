#include "Modules/MetrikSdk/otlp/HttpSender.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <new>
#include <stdexcept>
#include <string_view>
#include <thread>
#include <utility>

#include "Modules/MetrikSdk/Version.h"
#include "Modules/MetrikSdk/otlp/CurlLibrary.h"
#include "Modules/MetrikSdk/otlp/Gzip.h"

namespace MetrikSdk::otlp {
namespace {

/// A collector's answer is a short JSON object. A longer answer than this comes from something else.
constexpr std::size_t MAX_ANSWER_BYTES = std::size_t{64} * 1024;

/// How soon a request notices that it has to end.
constexpr int POLL_MS = 50;

std::atomic<bool> g_abandonAll = false;
std::atomic<int> g_requestsUnderWay = 0;

class RequestUnderWay {
public:
    RequestUnderWay() { ++g_requestsUnderWay; }
    ~RequestUnderWay() { --g_requestsUnderWay; }
    RequestUnderWay(const RequestUnderWay&) = delete;
    RequestUnderWay& operator=(const RequestUnderWay&) = delete;
};

/// Runs once in a process, on the thread that comes first. It is never undone, because other parts of the
/// process may use the library, too.
void InitialiseLibrary() {
    [[maybe_unused]] static const CURLcode done = Curl().global_init(CURL_GLOBAL_DEFAULT);
}

/// The library's minimum version knows every option that we use. It may refuse one all the same, for example
/// when its TLS backend does not support it. We must not ignore that: the next request would be less safe
/// than the configuration asks for.
template <typename Value>
void Set(CURL* easy, CURLoption option, Value value) {
    if (const auto code = Curl().easy_setopt(easy, option, value); code != CURLE_OK)
        throw std::runtime_error("HTTP option " + std::to_string(option) + ": " + Curl().easy_strerror(code));
}

} // namespace

HttpSender::HttpSender(EndpointConfig config)
    : m_config(std::move(config)), m_secrets(m_config.headers), m_headers(nullptr, Curl().slist_free_all),
      m_multi(nullptr, Curl().multi_cleanup), m_easy(nullptr, Curl().easy_cleanup) {
    InitialiseLibrary();
    m_multi.reset(Curl().multi_init());
    m_easy.reset(Curl().easy_init());
    if (!m_multi || !m_easy)
        throw std::bad_alloc();
    ConfigureHeaders();
    Configure();
    ConfigureTls();
}

void HttpSender::Configure() {
    auto* easy = m_easy.get();
    Set(easy, CURLOPT_URL, m_config.url.c_str());
    Set(easy, CURLOPT_PROTOCOLS_STR, "http,https");
    Set(easy, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    Set(easy, CURLOPT_POST, 1L);
    Set(easy, CURLOPT_HTTPHEADER, m_headers.get());
    Set(easy, CURLOPT_FOLLOWLOCATION, 0L); // a redirect could carry the credentials to another host
    Set(easy, CURLOPT_TIMEOUT_MS, static_cast<long>(m_config.timeout.count()));
    Set(easy, CURLOPT_NOSIGNAL, 1L);   // signals are for the service
    Set(easy, CURLOPT_QUICK_EXIT, 1L); // the end of the process must not wait for a name server
    Set(easy, CURLOPT_ERRORBUFFER, m_error);
    Set(easy, CURLOPT_WRITEFUNCTION, &HttpSender::OnBody);
    Set(easy, CURLOPT_HEADERFUNCTION, &HttpSender::OnHeader);
}

void HttpSender::ConfigureTls() {
    auto* easy = m_easy.get();
    Set(easy, CURLOPT_SSL_VERIFYPEER, 1L);
    Set(easy, CURLOPT_SSL_VERIFYHOST, 2L);
    Set(easy, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    if (!m_config.certificate.empty()) {
        Set(easy, CURLOPT_CAINFO, m_config.certificate.c_str());
        // Only the certificates of that file are trusted. By default, the library would also use the system's
        // directory.
        Set(easy, CURLOPT_CAPATH, static_cast<const char*>(nullptr));
    }
    if (!m_config.clientKey.empty())
        Set(easy, CURLOPT_SSLKEY, m_config.clientKey.c_str());
    if (!m_config.clientCertificate.empty())
        Set(easy, CURLOPT_SSLCERT, m_config.clientCertificate.c_str());
}

void HttpSender::ConfigureHeaders() {
    AddHeader("Content-Type: application/json");
    if (m_config.gzip)
        AddHeader("Content-Encoding: gzip");
    AddHeader("Expect:"); // do not wait for a "100 Continue" that many servers never send
    if (std::none_of(m_config.headers.begin(), m_config.headers.end(), [](const auto& header) {
            return ::strcasecmp(header.first.c_str(), "User-Agent") == 0;
        }))
        AddHeader(std::string("User-Agent: MetrikSdk/") + SDK_VERSION);
    for (const auto& [name, value] : m_config.headers) {
        std::string line = name;
        line += value.empty() ? ";" : ": " + value; // the library takes a header without a value in this form
        AddHeader(line);
    }
}

void HttpSender::AddHeader(const std::string& line) {
    auto* longer = Curl().slist_append(m_headers.get(), line.c_str());
    if (longer == nullptr)
        throw std::bad_alloc();
    static_cast<void>(m_headers.release());
    m_headers.reset(longer);
}

HttpResult HttpSender::Post(const std::string& body) {
    // Made before MustEnd is called: AbandonAll sets its flag first, and then looks for requests.
    const RequestUnderWay underWay;
    Answer answer;
    const auto sent = m_config.gzip ? Gzip(body) : std::string();
    const auto& bytes = m_config.gzip ? sent : body;
    Set(m_easy.get(), CURLOPT_POSTFIELDS, bytes.data());
    Set(m_easy.get(), CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(bytes.size()));
    Set(m_easy.get(), CURLOPT_WRITEDATA, static_cast<void*>(&answer));
    Set(m_easy.get(), CURLOPT_HEADERDATA, static_cast<void*>(&answer));
    m_error[0] = '\0';
    return Finish(Perform(), answer);
}

std::vector<std::string> HttpSender::HeaderNames() const {
    std::vector<std::string> names;
    for (const auto& [name, value] : m_config.headers)
        names.push_back(name);
    return names;
}

bool HttpSender::MustEnd() const {
    return m_abandoned || g_abandonAll;
}

CURLcode HttpSender::Perform() {
    if (Curl().multi_add_handle(m_multi.get(), m_easy.get()) != CURLM_OK)
        return CURLE_FAILED_INIT;
    CURLcode code = CURLE_ABORTED_BY_CALLBACK;
    int running = 1;
    while (!MustEnd() && running > 0) {
        if (Curl().multi_perform(m_multi.get(), &running) != CURLM_OK)
            break;
        if (running > 0)
            Curl().multi_poll(m_multi.get(), nullptr, 0, POLL_MS, nullptr);
    }
    int left = 0;
    while (const auto* message = Curl().multi_info_read(m_multi.get(), &left))
        if (message->msg == CURLMSG_DONE)
            code = message->data.result;
    Curl().multi_remove_handle(m_multi.get(), m_easy.get());
    return code;
}

HttpResult HttpSender::Finish(CURLcode code, Answer& answer) {
    auto result = std::move(answer.result);
    Curl().easy_getinfo(m_easy.get(), CURLINFO_RESPONSE_CODE, &result.status);
    Curl().easy_getinfo(m_easy.get(), CURLINFO_HTTP_CONNECTCODE, &result.proxyStatus);
    const char* type = nullptr;
    if (Curl().easy_getinfo(m_easy.get(), CURLINFO_CONTENT_TYPE, &type) == CURLE_OK && type != nullptr)
        result.contentType = type;
    result.body = m_secrets.WithoutThem(std::move(result.body));
    if (answer.headersEnded && (code == CURLE_OK || (code == CURLE_WRITE_ERROR && answer.cut)))
        return result;
    result.abandoned = MustEnd();
    curl_off_t sent = 0;
    Curl().easy_getinfo(m_easy.get(), CURLINFO_SIZE_UPLOAD_T, &sent);
    result.began = sent > 0;
    if (code == CURLE_OK) // the library accepts an answer that ends after its status line
        result.fault = "the answer ended inside its headers";
    else
        result.fault =
            m_secrets.WithoutThemInFault(m_error[0] != '\0' ? m_error : Curl().easy_strerror(code));
    return result;
}

std::size_t HttpSender::OnBody(char* bytes, std::size_t size, std::size_t count, void* data) {
    auto& answer = *static_cast<Answer*>(data);
    const auto length = size * count;
    const auto room = MAX_ANSWER_BYTES - answer.result.body.size();
    answer.result.body.append(bytes, std::min(length, room));
    answer.cut = length > room;
    return answer.cut ? 0 : length; // 0 ends the transfer, because enough has been read
}

std::size_t HttpSender::OnHeader(char* bytes, std::size_t size, std::size_t count, void* data) {
    static constexpr std::string_view NAME = "retry-after:";
    auto& answer = *static_cast<Answer*>(data);
    auto& result = answer.result;
    const std::string_view line(bytes, size * count);
    if (line.starts_with("HTTP/")) { // a new answer begins: the one before was an interim answer
        result.retryAfter.clear();
        answer.headersEnded = false;
    }
    if (line == "\r\n" || line == "\n")
        answer.headersEnded = true;
    if (line.size() > NAME.size() && ::strncasecmp(line.data(), NAME.data(), NAME.size()) == 0) {
        const auto first = line.find_first_not_of(" \t", NAME.size());
        const auto last = line.find_last_not_of(" \t\r\n");
        if (first != std::string_view::npos && last >= first)
            result.retryAfter = line.substr(first, last - first + 1);
    }
    return line.size();
}

void HttpSender::AbandonAll(std::chrono::milliseconds patience) {
    g_abandonAll = true;
    const auto deadline = std::chrono::steady_clock::now() + patience;
    // We use no condition variable: the thread that called exit() may have been interrupted anywhere.
    while (g_requestsUnderWay > 0 && std::chrono::steady_clock::now() < deadline)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

} // namespace MetrikSdk::otlp
