#pragma once

#include <string>

namespace MetrikSdk::otlp {

/// What came back for one request.
struct HttpResult {
    std::string fault;      ///< Why there was no complete answer; empty when there was one.
    bool began = false;     ///< Part of the body was sent, so its size may be the reason for the fault.
    bool abandoned = false; ///< We ended the request ourselves, because we have to stop.
    long status = 0;
    long proxyStatus = 0; ///< Of the proxy's answer, where https goes through one.
    std::string contentType;
    std::string retryAfter; ///< The value of the header, as it came.
    std::string body;       ///< The first part of it: see HttpSender.
};

} // namespace MetrikSdk::otlp
