#pragma once

#include <string>

namespace MetrikSdk::otlp {

/// What came back for one request.
struct HttpResult {
    std::string fault;      ///< Why there was no complete answer; empty when there was one.
    bool began = false;     ///< Part of the body had left, so that the fault may be its size's.
    bool abandoned = false; ///< We ended the request ourselves, because we are to stop.
    long status = 0;
    std::string contentType;
    std::string retryAfter; ///< The header as it came.
    std::string body;       ///< The first part of it: see HttpSender.
};

} // namespace MetrikSdk::otlp
