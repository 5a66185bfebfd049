#pragma once

#include <deque>
#include <functional>
#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/HttpRequest.h"
#include "trelm/InputDataStream.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm::test {

// A stand-in for the host's "HttpRequestFactory": hands out requests that record what the client
// sends and answer with canned responses instead of talking to a network.
//
// Answers are taken, in order of precedence, from the responder function, the queue, and the
// default answer (200 with an empty body).
// Thread safety: every member may be called from any thread; requests of different threads may
// run at once (the concurrency tests rely on it).
class FakeHttpRequestFactory : public Component {
public:
    // One request as sent.
    struct Exchange {
        String url;
        Map<String, String> fields;
        SmartPtr<InputDataStream> upload;
    };
    // What the fake request reports. A failed `sendError` makes sendRequest fail with it.
    struct Answer {
        int status = 200;
        String body;
        uError sendError;
    };
    using Responder = std::function<Answer(Exchange const&)>;

    FakeHttpRequestFactory();
    ~FakeHttpRequestFactory() override;

    void setDefault(Answer answer);
    void queue(Answer answer);
    void queue(String body) { queue(Answer{200, std::move(body), uError()}); }
    void setResponder(Responder responder);
    // The factory message fails with kNotFound (no request is handed out).
    void refuseRequests(bool refuse);

    std::vector<Exchange> exchanges() const;
    unsigned disconnects() const;
    void clear();

    // Called by the fake requests.
    Answer answer(Exchange const& exchange);
    void countDisconnect();

protected:
    uError handleMessage(IMessage& msg) override;

private:
    // Guards every field below.
    mutable std::mutex mutex_;
    std::vector<Exchange> exchanges_;
    std::deque<Answer> queue_;
    Answer default_;
    Responder responder_;
    bool refuse_ = false;
    unsigned disconnects_ = 0;
};

}  // namespace trelm::test
