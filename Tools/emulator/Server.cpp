#include "Server.h"

#include "RequestParser.h"

#include <arpa/inet.h>
#include <dirent.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <iostream>
#include <string_view>

#include <httplib.h>
#include <openssl/ssl.h>

#if defined(__SANITIZE_THREAD__)
// The HTTP library is a prebuilt, uninstrumented shared library: the thread sanitizer sees the
// memcpy/memcmp it calls but not the synchronisation inside it (lazily built function statics
// read after their guard's inlined check), and reports races between its own workers. Calls that
// come from the library itself are ignored; everything our handlers do stays checked.
extern "C" const char* __tsan_default_suppressions() { return "called_from_lib:libcpp-httplib.so\n"; }
#endif

namespace emu {
namespace {

constexpr const char* kPath = "/restserver.php";
// The request's own Content-Type, kept where the HTTP library does not look (see configure).
constexpr const char* kBodyType = "X-Emulator-Body-Type";
// Requests a client may send on one connection. The library's default of 5 would force a new
// connection (and a TLS handshake) every fifth call.
constexpr std::size_t kKeepAliveMaxCount = 1000000;

bool sameEndpoint(const sockaddr_storage& a, const std::string& address, int port) {
    char text[INET6_ADDRSTRLEN] = {};
    int p = -1;
    if (a.ss_family == AF_INET) {
        const auto* in = reinterpret_cast<const sockaddr_in*>(&a);
        inet_ntop(AF_INET, &in->sin_addr, text, sizeof text);
        p = ntohs(in->sin_port);
    } else if (a.ss_family == AF_INET6) {
        const auto* in6 = reinterpret_cast<const sockaddr_in6*>(&a);
        inet_ntop(AF_INET6, &in6->sin6_addr, text, sizeof text);
        p = ntohs(in6->sin6_port);
    } else {
        return false;
    }
    return p == port && (address.empty() || address == text);
}

// Calls `fn(fd)` for each connected socket of this process whose local end is `localAddress`
// (empty: any) and `localPort`, and whose peer matches `peerAddress`/`peerPort` when those are given
// (port -1: any). The library never hands connection sockets to its user; the process's descriptor
// table is the one place to find them.
template <typename Fn>
void forEachConnection(const std::string& localAddress, int localPort, const std::string& peerAddress, int peerPort,
                       Fn fn) {
    DIR* dir = opendir("/proc/self/fd");
    if (dir == nullptr) return;
    while (dirent* entry = readdir(dir)) {
        char* end = nullptr;
        const long fd = std::strtol(entry->d_name, &end, 10);
        if (end == entry->d_name || *end != '\0' || fd == dirfd(dir)) continue;
        sockaddr_storage local{}, peer{};
        socklen_t localLength = sizeof local, peerLength = sizeof peer;
        if (getsockname(static_cast<int>(fd), reinterpret_cast<sockaddr*>(&local), &localLength) != 0) continue;
        // A listening socket has no peer and is skipped here.
        if (getpeername(static_cast<int>(fd), reinterpret_cast<sockaddr*>(&peer), &peerLength) != 0) continue;
        if (!sameEndpoint(local, localAddress, localPort)) continue;
        if (peerPort >= 0 && !sameEndpoint(peer, peerAddress, peerPort)) continue;
        if (!fn(static_cast<int>(fd))) break;
    }
    closedir(dir);
}

// The socket of the connection `req` arrived on (unique by its two endpoints while this worker
// holds the connection open).
int connectionSocket(const httplib::Request& req) {
    if (req.ssl != nullptr) return SSL_get_fd(req.ssl);
    int found = -1;
    forEachConnection(req.local_addr, req.local_port, req.remote_addr, req.remote_port, [&](int fd) {
        found = fd;
        return false;
    });
    return found;
}

// The query string of a request target ("/restserver.php?a=1" gives "a=1").
std::string_view queryOf(const std::string& target) {
    const std::size_t mark = target.find('?');
    return mark == std::string::npos ? std::string_view() : std::string_view(target).substr(mark + 1);
}

void deliver(const httplib::Request& req, httplib::Response& res, HttpReply reply) {
    switch (reply.delivery) {
        case HttpReply::Delivery::Whole:
            res.status = reply.status;
            // set_content would copy the body; a fresh response has no headers to replace.
            res.body = std::move(reply.body);
            res.set_header("Content-Type", reply.contentType);
            return;
        case HttpReply::Delivery::Dropped: {
            // Shutting the socket down makes the library's write of the answer fail; it then closes
            // the connection, and the client has received nothing at all.
            const int fd = connectionSocket(req);
            if (fd >= 0) ::shutdown(fd, SHUT_RDWR);
            res.status = 500;
            return;
        }
        case HttpReply::Delivery::Truncated: {
            res.status = reply.status;
            const std::size_t total = reply.body.size();
            auto body = std::make_shared<std::string>(std::move(reply.body));
            // Returning false from the provider aborts the answer and closes the connection after
            // the first half has gone out.
            res.set_content_provider(total, reply.contentType.c_str(),
                                     [body](std::size_t offset, std::size_t, httplib::DataSink& sink) {
                                         if (offset != 0) return false;
                                         sink.write(body->data(), body->size() / 2);
                                         return false;
                                     });
            return;
        }
    }
}

}  // namespace

Server::Server(Options options, Handler handler) : options_(std::move(options)), handler_(std::move(handler)) {}

Server::~Server() { stop(); }

void Server::configure(httplib::Server& server, bool https) {
    const int threads = options_.threads > 0 ? options_.threads : 1;
    server.new_task_queue = [threads] { return new httplib::ThreadPool(static_cast<std::size_t>(threads)); };
    // Without TCP_NODELAY the headers and the body of each answer leave in separate segments and
    // the second waits for the client's delayed ACK: about 40 ms per keep-alive request.
    server.set_tcp_nodelay(true);
    // The library's default also sets SO_REUSEPORT, which would let a second emulator share the
    // port and take half of the first one's connections. Address reuse alone allows a restart on
    // a port whose old connections are still in TIME_WAIT.
    server.set_socket_options([](int sock) {
        int yes = 1;
        setsockopt(sock, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
    });
    server.set_keep_alive_max_count(kKeepAliveMaxCount);
    server.set_keep_alive_timeout(options_.keepAliveSeconds > 0 ? options_.keepAliveSeconds : 1);

    // The library reads url-encoded bodies only up to 8 KB and parses multipart bodies itself,
    // dropping a file part that has no name. Under another header name the body reaches the
    // handler's reader untouched, and RequestParser reads it as the service did.
    server.set_pre_routing_handler([](const httplib::Request& req, httplib::Response&) {
        // The library's request object is its own and mutable; only this hook sees it as const.
        auto& mutableReq = const_cast<httplib::Request&>(req);
        auto it = mutableReq.headers.find("Content-Type");
        if (it != mutableReq.headers.end()) {
            std::string type = std::move(it->second);
            mutableReq.headers.erase(it);
            mutableReq.headers.emplace(kBodyType, std::move(type));
        }
        return httplib::Server::HandlerResponse::Unhandled;
    });

    auto answer = [this](const httplib::Request& req, httplib::Response& res, HttpCall call) {
        HttpReply reply;
        try {
            reply = handler_(call);
        } catch (const std::exception& e) {
            // An emulator fault outside the protocol's own handling: said before the bare 500.
            std::cerr << "trelm-emulator: internal error answering " << req.method << " " << req.path << ": "
                      << e.what() << "\n";
            reply = HttpReply{500, "internal error\n", "text/plain", HttpReply::Delivery::Whole};
        }
        deliver(req, res, std::move(reply));
    };
    server.Get(kPath, [https, answer](const httplib::Request& req, httplib::Response& res) {
        HttpCall call;
        call.https = https;
        RequestParser::addUrlEncoded(queryOf(req.target), call);
        answer(req, res, std::move(call));
    });
    const std::size_t maxBody = options_.maxBodyBytes;
    server.Post(kPath, [https, answer, maxBody](const httplib::Request& req, httplib::Response& res,
                                                const httplib::ContentReader& reader) {
        HttpCall call;
        call.https = https;
        RequestParser::addUrlEncoded(queryOf(req.target), call);
        // A body over the limit is read to its end (so that the client gets the answer rather
        // than a reset connection) and then ignored, as the service's front end ignored it: the
        // call has the arguments of its query string alone.
        std::string body;
        bool tooLarge = false;
        reader([&](const char* data, std::size_t length) {
            if (tooLarge || body.size() + length > maxBody) {
                tooLarge = true;
                body.clear();
                body.shrink_to_fit();
            } else {
                body.append(data, length);
            }
            return true;
        });
        // A malformed multipart body adds nothing either: the call keeps its query string's
        // arguments, whatever addBody says.
        if (!tooLarge) RequestParser::addBody(req.get_header_value(kBodyType), body, call);
        call.bodyIgnored = tooLarge;
        answer(req, res, std::move(call));
    });
}

bool Server::launch(Listener& listener, int wantedPort, int& boundPort, std::string& error) {
    httplib::Server& server = *listener.server;
    if (wantedPort == 0) {
        boundPort = server.bind_to_any_port(options_.bindAddress);
        if (boundPort < 0) boundPort = -1;
    } else {
        boundPort = server.bind_to_port(options_.bindAddress, wantedPort) ? wantedPort : -1;
    }
    if (boundPort < 0) {
        error = "cannot listen on " + options_.bindAddress + ":" + std::to_string(wantedPort);
        return false;
    }
    auto finished = std::make_shared<std::atomic<bool>>(false);
    listener.thread = std::thread([&server, finished] {
        // A client that goes away while its answer is written must not end the process: writes on
        // a TLS connection raise SIGPIPE. Workers are created by this thread and inherit the mask.
        sigset_t pipe;
        sigemptyset(&pipe);
        sigaddset(&pipe, SIGPIPE);
        pthread_sigmask(SIG_BLOCK, &pipe, nullptr);
        server.listen_after_bind();
        *finished = true;
    });
    // stop() only takes effect once the server runs; wait so that an early stop cannot be lost.
    while (!server.is_running() && !*finished) std::this_thread::sleep_for(std::chrono::milliseconds(1));
    if (*finished) {
        error = "the listener on " + options_.bindAddress + ":" + std::to_string(boundPort) + " stopped at once";
        return false;
    }
    return true;
}

bool Server::start(std::string& error) {
    if (options_.httpPort >= 0) {
        http_.server = std::make_unique<httplib::Server>();
        configure(*http_.server, false);
        if (!launch(http_, options_.httpPort, httpPort_, error)) {
            stop();
            return false;
        }
    }
    if (options_.httpsPort >= 0) {
        https_.server = std::make_unique<httplib::SSLServer>(options_.certPath.c_str(), options_.keyPath.c_str());
        if (!https_.server->is_valid()) {
            error = "cannot load the certificate " + options_.certPath + " and its key " + options_.keyPath;
            stop();
            return false;
        }
        configure(*https_.server, true);
        if (!launch(https_, options_.httpsPort, httpsPort_, error)) {
            stop();
            return false;
        }
    }
    return true;
}

void Server::stop() {
    for (auto [l, port] : {std::pair{&http_, httpPort_}, std::pair{&https_, httpsPort_}}) {
        if (l->server) l->server->stop();
        // A worker waits on an idle keep-alive connection until the client speaks or the keep-alive
        // time runs out. Shutting the reading side of our accepted connections lets each worker
        // see the end at once; one busy with a request still writes its answer, then closes.
        if (port > 0) {
            forEachConnection(options_.bindAddress == "0.0.0.0" ? std::string() : options_.bindAddress, port, {}, -1,
                              [](int fd) {
                                  ::shutdown(fd, SHUT_RD);
                                  return true;
                              });
        }
        if (l->thread.joinable()) l->thread.join();
        l->server.reset();
    }
    httpPort_ = -1;
    httpsPort_ = -1;
}

}  // namespace emu
