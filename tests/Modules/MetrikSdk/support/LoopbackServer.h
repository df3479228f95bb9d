#pragma once

#include <atomic>
#include <functional>
#include <list>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <Poco/Net/ServerSocket.h>
#include <Poco/Net/StreamSocket.h>

/// A request that the server received.
struct Request {
    std::string line;                           ///< Such as "POST /v1/logs HTTP/1.1".
    std::map<std::string, std::string> headers; ///< Names in lower case.
    std::string body;                           ///< Unpacked when it was compressed.
    int connection = 0;                         ///< The number of its connection, from 1.
};

/// What the server does with a request.
struct Reply {
    enum class Manner {
        Answer,
        Never,          ///< Keep the connection open and send nothing.
        Close,          ///< Close the connection without an answer.
        CloseHalfway,   ///< Announce a body, send half of it, close.
        CloseInHeaders, ///< Send a status line and half a header, close.
        SpeakNonsense,  ///< Send something that is no HTTP.
        Flood           ///< Send a body without an end.
    };
    int status = 200;
    std::string body = "{}";
    std::string headers; ///< Whole lines, each ended by "\r\n".
    Manner manner = Manner::Answer;
};

/// An HTTP server on a free port of the loopback address. It answers each request as the script says. A
/// library's server could not misbehave on purpose.
class LoopbackServer {
public:
    using Script = std::function<Reply(const Request&)>;

    explicit LoopbackServer(Script script);
    /// Over TLS. The caller has made the socket.
    LoopbackServer(Script script, const Poco::Net::ServerSocket& socket);
    ~LoopbackServer();

    /// The server's address, without a trailing slash.
    std::string Url(const std::string& scheme = "http") const;

    std::vector<Request> Requests() const;
    std::size_t RequestCount() const;

private:
    struct Connection {
        Poco::Net::StreamSocket socket;
        std::thread thread;
    };

    void Accept();
    void Serve(Poco::Net::StreamSocket socket, int number);
    bool Read(Poco::Net::StreamSocket& socket, std::string& buffer, Request& request);
    bool Perform(Poco::Net::StreamSocket& socket, const Reply& reply);

    Script m_script;
    Poco::Net::ServerSocket m_socket;
    std::atomic<bool> m_stop = false;
    mutable std::mutex m_mutex; ///< Guards the two lists. The script is called under it.
    std::vector<Request> m_requests;
    std::list<Connection> m_connections;
    std::thread m_thread;
};
