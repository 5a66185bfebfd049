// A publishing request is never sent twice behind the caller's back: libcurl sends a request
// again on a new connection when the kept connection it went out on dies before any answer, so
// a publishing request must not go out on a kept connection at all.
#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "ErrorAssertions.h"
#include "HttpRequestFactory.h"

namespace trelm {
namespace {

// A plain HTTP server on 127.0.0.1 that keeps its connections open between requests. With
// `firstDies`, its first connection dies under its client: it answers the first request on it,
// reads the second one whole and closes the connection without answering. It counts the
// connections it accepted and the bodies it has read.
// Thread safety: bodies() and connections() may be called while connections are served.
class DyingConnectionServer {
public:
    explicit DyingConnectionServer(bool firstDies = true) : firstDies_(firstDies) {
        listener_ = ::socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        if (listener_ < 0 || ::bind(listener_, reinterpret_cast<sockaddr*>(&address), size) != 0 ||
            ::listen(listener_, 8) != 0 || ::getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
            std::abort();
        }
        port_ = ntohs(address.sin_port);
        acceptor_ = std::thread([this] { acceptLoop(); });
    }

    ~DyingConnectionServer() {
        ::shutdown(listener_, SHUT_RDWR);
        acceptor_.join();
        {
            std::lock_guard<std::mutex> lock(mutex_);
            for (int fd : open_) ::shutdown(fd, SHUT_RDWR);
        }
        for (std::thread& t : connections_) t.join();
        ::close(listener_);
    }

    std::string url() const { return "http://127.0.0.1:" + std::to_string(port_) + "/publish"; }

    int connections() const { return accepted_.load(); }

    // How many times each body was read.
    std::map<std::string, int> bodies() const {
        std::lock_guard<std::mutex> lock(mutex_);
        return bodies_;
    }

private:
    void acceptLoop() {
        for (int index = 0;; ++index) {
            int fd = ::accept(listener_, nullptr, nullptr);
            if (fd < 0) return;
            ++accepted_;
            {
                std::lock_guard<std::mutex> lock(mutex_);
                open_.push_back(fd);
            }
            // Only the acceptor touches connections_ until the destructor joins it.
            connections_.emplace_back([this, fd, index] { serve(fd, firstDies_ && index == 0); });
        }
    }

    // Reads one request; false when the connection ended first.
    static bool readRequest(int fd, std::string& pending, std::string& body) {
        std::size_t end;
        char buffer[4096];
        while ((end = pending.find("\r\n\r\n")) == std::string::npos) {
            ssize_t n = ::read(fd, buffer, sizeof buffer);
            if (n <= 0) return false;
            pending.append(buffer, static_cast<std::size_t>(n));
        }
        std::size_t length = 0;
        std::size_t at = pending.find("Content-Length: ");
        if (at != std::string::npos && at < end) length = std::strtoul(pending.c_str() + at + 16, nullptr, 10);
        while (pending.size() < end + 4 + length) {
            ssize_t n = ::read(fd, buffer, sizeof buffer);
            if (n <= 0) return false;
            pending.append(buffer, static_cast<std::size_t>(n));
        }
        body = pending.substr(end + 4, length);
        pending.erase(0, end + 4 + length);
        return true;
    }

    void serve(int fd, bool dies) {
        std::string pending;
        std::string body;
        for (int request = 0; readRequest(fd, pending, body); ++request) {
            {
                std::lock_guard<std::mutex> lock(mutex_);
                ++bodies_[body];
            }
            if (dies && request == 1) break;
            static char const answer[] = "HTTP/1.1 200 OK\r\nContent-Length: 2\r\n\r\nok";
            if (::write(fd, answer, sizeof answer - 1) < 0) break;
        }
        ::shutdown(fd, SHUT_RDWR);
    }

    bool const firstDies_;
    std::atomic<int> accepted_{0};
    int listener_ = -1;
    int port_ = 0;
    std::thread acceptor_;
    std::vector<std::thread> connections_;
    mutable std::mutex mutex_;  // guards bodies_ and open_
    std::map<std::string, int> bodies_;
    std::vector<int> open_;
};

uError post(HttpRequestFactory& factory, std::string const& url, char const* field, bool publishing) {
    SmartPtr<HttpRequest> request;
    TRELM_RETURN_IF_ERROR(factory.createRequest(request));
    TRELM_RETURN_IF_ERROR(request->setup(String(url)));
    if (publishing) TRELM_RETURN_IF_ERROR(request->setPublishing(true));
    TRELM_RETURN_IF_ERROR(request->setPostData(Map<String, String>{{"n", field}}));
    TRELM_RETURN_IF_ERROR(request->sendRequest());
    return request->disconnect();
}

// The first request leaves its connection in the factory's cache; the second finds it dead.
// Sent as an ordinary request, the second reaches the server twice (libcurl's silent retry,
// which is why the test's server is a trustworthy one); marked as publishing, once.
TEST(PublishingRequestTest, IsNeverResentAfterAKeptConnectionDies) {
    struct Case {
        bool publishing;
        int timesSeen;
    } const cases[] = {{false, 2}, {true, 1}};
    for (Case const& c : cases) {
        SCOPED_TRACE(c.publishing ? "publishing" : "ordinary");
        DyingConnectionServer server;
        HttpRequestFactory factory;
        ASSERT_OK(post(factory, server.url(), "first", false));
        EXPECT_OK(post(factory, server.url(), "second", c.publishing));
        EXPECT_EQ(server.bodies()["n=second"], c.timesSeen);
        EXPECT_EQ(server.bodies()["n=first"], 1);
    }
}

// The factory's requests take their libcurl handles from a pool: a handle that carried a
// publishing request must not make the ordinary requests after it open new connections too.
TEST(PublishingRequestTest, OnlyPublishingRequestsOpenNewConnections) {
    struct Case {
        std::vector<bool> publishing;  // one request each, in order
        int connections;
    } const cases[] = {
        {{false, false, false}, 1},
        {{true, false, false}, 1},  // the ordinary ones reuse the publishing one's connection
        {{false, true, false}, 2},
        {{true, false, true, false}, 2},
        {{true, true, true}, 3},
    };
    for (Case const& c : cases) {
        DyingConnectionServer server(false);
        HttpRequestFactory factory;
        for (bool publishing : c.publishing) {
            ASSERT_OK(post(factory, server.url(), "n", publishing));
        }
        EXPECT_EQ(server.connections(), c.connections) << ::testing::PrintToString(c.publishing);
    }
}

}  // namespace
}  // namespace trelm
