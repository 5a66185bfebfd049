#include "LoopbackServer.h"

#include <gtest/gtest.h>

#include <chrono>

namespace trelm::test {

LoopbackServer::LoopbackServer() : server_(std::make_unique<httplib::Server>()) { start(); }

LoopbackServer::LoopbackServer(std::string const& certPath, std::string const& keyPath)
    : server_(std::make_unique<httplib::SSLServer>(certPath.c_str(), keyPath.c_str())), tls_(true) {
    EXPECT_TRUE(server_->is_valid()) << "TLS server could not load its certificate";
    start();
}

void LoopbackServer::start() {
    server_->set_keep_alive_max_count(100);
    auto record = [this](httplib::Request const& req) {
        Seen s;
        s.path = req.path;
        s.host = req.get_header_value("Host");
        s.contentType = req.get_header_value("Content-Type");
        s.remotePort = req.remote_port;
        for (auto const& [k, v] : req.params) s.params[k] = v;
        for (auto const& [k, v] : req.files) s.parts[k] = v;
        std::lock_guard<std::mutex> lock(mutex_);
        seen_.push_back(std::move(s));
    };
    server_->Post(R"(/status/(\d+))", [record](httplib::Request const& req, httplib::Response& res) {
        record(req);
        res.status = std::stoi(req.matches[1]);
        res.set_content("status " + std::string(req.matches[1]), "text/plain");
    });
    server_->Post("/echo", [record](httplib::Request const& req, httplib::Response& res) {
        record(req);
        res.set_content(req.get_param_value("echo"), "text/plain");
    });
    server_->Post("/hang", [this, record](httplib::Request const& req, httplib::Response& res) {
        record(req);
        std::unique_lock<std::mutex> lock(mutex_);
        releasedCv_.wait_for(lock, std::chrono::seconds(30), [this] { return released_; });
        res.set_content("late", "text/plain");
    });
    port_ = server_->bind_to_any_port("127.0.0.1");
    EXPECT_GT(port_, 0);
    thread_ = std::thread([this] { server_->listen_after_bind(); });
    while (!server_->is_running()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

LoopbackServer::~LoopbackServer() {
    release();
    server_->stop();
    if (thread_.joinable()) thread_.join();
}

std::string LoopbackServer::url(std::string const& path) const {
    return std::string(tls_ ? "https" : "http") + "://127.0.0.1:" + std::to_string(port_) + path;
}

std::vector<LoopbackServer::Seen> LoopbackServer::requests() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return seen_;
}

void LoopbackServer::release() {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        released_ = true;
    }
    releasedCv_.notify_all();
}

}  // namespace trelm::test
