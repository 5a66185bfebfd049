#pragma once

#include <httplib.h>

#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace trelm::test {

// A small HTTP or HTTPS server on 127.0.0.1 (ephemeral port) that records what reaches it.
//   POST /status/<n>  answers status n with body "status <n>"
//   POST /echo        answers 200 with the value of the form field "echo"
//   POST /hang        answers only when release() is called (or the server stops)
// Thread safety: requests() and release() may be called while requests are served.
class LoopbackServer {
public:
    struct Seen {
        std::string path;
        std::string host;  // the Host header
        std::string contentType;
        int remotePort = -1;
        std::map<std::string, std::string> params;  // url-encoded fields
        std::map<std::string, httplib::MultipartFormData> parts;
    };

    // Plain HTTP.
    LoopbackServer();
    // HTTPS with the given PEM certificate and key.
    LoopbackServer(std::string const& certPath, std::string const& keyPath);
    ~LoopbackServer();

    int port() const { return port_; }
    std::string url(std::string const& path) const;
    std::vector<Seen> requests() const;
    void release();

private:
    void start();

    std::unique_ptr<httplib::Server> server_;
    std::thread thread_;
    int port_ = -1;
    bool tls_ = false;

    // Guards seen_ and released_.
    mutable std::mutex mutex_;
    std::condition_variable releasedCv_;
    std::vector<Seen> seen_;
    bool released_ = false;
};

}  // namespace trelm::test
