// The emulator's HTTP and HTTPS listeners at "/restserver.php".
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <thread>

#include "Signature.h"

namespace httplib {
class Server;
}

namespace emu {

// One request, its arguments merged from the query string and a url-encoded or multipart body
// (a later source wins for a repeated name: body over query string); see RequestParser.
struct HttpCall {
    Arguments args;
    std::string file;        // the bytes of the first multipart part that carries a file name
    bool haveFile = false;
    bool https = false;
    bool bodyIgnored = false;  // the body was over the server's limit: args hold the query string's
};

// How to answer it.
struct HttpReply {
    enum class Delivery {
        Whole,      // the status and body as given
        Truncated,  // headers announce the whole body; half of it is sent, then the connection closes
        Dropped,    // the connection closes without a byte of answer
    };
    int status = 200;
    std::string body;
    std::string contentType = "text/xml; charset=utf-8";
    Delivery delivery = Delivery::Whole;
};

// Listens on `bindAddress`: plain HTTP and/or HTTPS, each on a fixed port, an ephemeral one (0)
// or not at all (-1). Each listener runs on its own thread with a pool of workers; one worker
// serves one connection at a time, for as long as the client keeps it alive.
//
// Thread safety: start and stop are called from one controlling thread; the handler is called
// from the worker threads concurrently and must be thread safe. The handler must outlive the
// server (or stop must have returned).
class Server {
public:
    using Handler = std::function<HttpReply(const HttpCall&)>;

    struct Options {
        std::string bindAddress = "127.0.0.1";
        int httpPort = 0;
        int httpsPort = -1;
        std::string certPath;  // PEM server certificate; required when HTTPS is on
        std::string keyPath;   // PEM private key of the certificate
        int threads = 16;      // workers per listener
        int keepAliveSeconds = 5;
        // The largest request body read; a larger one is received and ignored (the call keeps the
        // arguments of its query string). 16 MiB holds the largest photos of the service's time
        // (a few MB straight from a camera) with room to spare, and bounds what one worker holds.
        std::size_t maxBodyBytes = 16u * 1024u * 1024u;
    };

    Server(Options options, Handler handler);
    ~Server();  // stops
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;

    // Binds the listeners and starts serving. Returns false and sets `error` if a port cannot be
    // bound or the certificate cannot be loaded; nothing keeps running then.
    bool start(std::string& error);
    // Closes the listeners, ends their connections and waits for their threads. A request being
    // answered gets its answer; an idle keep-alive connection is closed at once.
    void stop();

    // The bound ports; -1 for a listener that is off or not started.
    int httpPort() const { return httpPort_; }
    int httpsPort() const { return httpsPort_; }

private:
    struct Listener {
        std::unique_ptr<httplib::Server> server;
        std::thread thread;
    };

    void configure(httplib::Server& server, bool https);
    bool launch(Listener& listener, int wantedPort, int& boundPort, std::string& error);

    const Options options_;  // constant after construction
    const Handler handler_;  // constant after construction

    // Owned by the controlling thread (start/stop).
    Listener http_;
    Listener https_;
    int httpPort_ = -1;
    int httpsPort_ = -1;
};

}  // namespace emu
