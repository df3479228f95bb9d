#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"

#include <algorithm>
#include <array>
#include <sstream>

#include <Poco/InflatingStream.h>
#include <Poco/Net/SocketAddress.h>

namespace {

constexpr int POLL_MICROSECONDS = 20'000;

std::string LowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

std::string Unpacked(const std::string& packed) {
    std::istringstream in(packed);
    Poco::InflatingInputStream inflater(in, Poco::InflatingStreamBuf::STREAM_GZIP);
    return {std::istreambuf_iterator<char>(inflater), {}};
}

void ParseHead(const std::string& head, Request& request) {
    std::istringstream lines(head);
    std::getline(lines, request.line);
    request.line.pop_back();
    for (std::string line; std::getline(lines, line) && line.size() > 1;) {
        const auto colon = line.find(':');
        const auto value = line.find_first_not_of(' ', colon + 1);
        request.headers[LowerCase(line.substr(0, colon))] = line.substr(value, line.size() - value - 1);
    }
}

} // namespace

LoopbackServer::LoopbackServer(Script script)
    : LoopbackServer(std::move(script), Poco::Net::ServerSocket(Poco::Net::SocketAddress("127.0.0.1", 0))) {}

LoopbackServer::LoopbackServer(Script script, const Poco::Net::ServerSocket& socket)
    : m_script(std::move(script)), m_socket(socket), m_thread([this] { Accept(); }) {}

LoopbackServer::~LoopbackServer() {
    m_stop = true;
    m_thread.join();
    for (auto& connection : m_connections)
        connection.thread.join();
}

std::string LoopbackServer::Url(const std::string& scheme) const {
    return scheme + "://127.0.0.1:" + std::to_string(m_socket.address().port());
}

std::vector<Request> LoopbackServer::Requests() const {
    const std::lock_guard lock(m_mutex);
    return m_requests;
}

std::size_t LoopbackServer::RequestCount() const {
    const std::lock_guard lock(m_mutex);
    return m_requests.size();
}

void LoopbackServer::Accept() {
    for (int number = 1; !m_stop;) {
        if (!m_socket.poll(Poco::Timespan(POLL_MICROSECONDS), Poco::Net::Socket::SELECT_READ))
            continue;
        auto socket = m_socket.acceptConnection();
        auto& connection = m_connections.emplace_back();
        connection.socket = socket;
        connection.thread = std::thread([this, socket, number] { Serve(socket, number); });
        ++number;
    }
}

void LoopbackServer::Serve(Poco::Net::StreamSocket socket, int number) {
    try {
        socket.setNoDelay(true);
        std::string buffer;
        for (Request request; Read(socket, buffer, request); request = {}) {
            request.connection = number;
            Reply reply;
            {
                const std::lock_guard lock(m_mutex);
                m_requests.push_back(request);
                reply = m_script(request);
            }
            if (!Perform(socket, reply))
                break;
        }
    } catch (const Poco::Exception&) { // the client closed the connection, or does not trust our certificate
    }
    socket.close();
}

bool LoopbackServer::Read(Poco::Net::StreamSocket& socket, std::string& buffer, Request& request) {
    std::size_t wanted = std::string::npos; // the size of the whole request, known when its head is there
    std::size_t head = 0;
    while (wanted == std::string::npos || buffer.size() < wanted) {
        if (m_stop)
            return false;
        if (!socket.poll(Poco::Timespan(POLL_MICROSECONDS), Poco::Net::Socket::SELECT_READ))
            continue;
        std::array<char, 65536> bytes{};
        const int count = socket.receiveBytes(bytes.data(), static_cast<int>(bytes.size()));
        if (count == 0)
            return false;
        if (count > 0) // negative: the TLS layer must first read or write more
            buffer.append(bytes.data(), static_cast<std::size_t>(count));
        if (head == 0 && buffer.find("\r\n\r\n") != std::string::npos) {
            head = buffer.find("\r\n\r\n") + 4;
            ParseHead(buffer.substr(0, head), request);
            const auto length = request.headers.find("content-length"); // a CONNECT has none
            wanted = head + (length == request.headers.end() ? 0 : std::stoul(length->second));
        }
    }
    request.body = buffer.substr(head, wanted - head);
    const auto encoding = request.headers.find("content-encoding");
    if (encoding != request.headers.end() && encoding->second == "gzip")
        request.body = Unpacked(request.body);
    buffer.erase(0, wanted);
    return true;
}

bool LoopbackServer::Perform(Poco::Net::StreamSocket& socket, const Reply& reply) {
    const auto send = [&](const std::string& text) {
        socket.sendBytes(text.data(), static_cast<int>(text.size()));
    };
    const auto head = "HTTP/1.1 " + std::to_string(reply.status) + " Whatever\r\n" + reply.headers;
    switch (reply.manner) {
    case Reply::Manner::Answer:
        send(head + "Content-Length: " + std::to_string(reply.body.size()) + "\r\n\r\n" + reply.body);
        return true;
    case Reply::Manner::Never:
        while (!m_stop && !socket.poll(Poco::Timespan(POLL_MICROSECONDS), Poco::Net::Socket::SELECT_READ)) {
        }
        return false;
    case Reply::Manner::CloseHalfway:
        send(head + "Content-Length: 100\r\n\r\n" + std::string(50, ' '));
        return false;
    case Reply::Manner::CloseInHeaders:
        send(head + "Content-Le");
        return false;
    case Reply::Manner::SpeakNonsense:
        send("\x01\x02 what? \xff\xfe\r\n\r\n");
        return false;
    case Reply::Manner::Flood:
        send(head + "Transfer-Encoding: chunked\r\n\r\n");
        while (!m_stop)
            send("1000\r\n" + std::string(4096, 'x') + "\r\n");
        return false;
    case Reply::Manner::Close:
        return false;
    }
    return false;
}
