#pragma once

#include <deque>
#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/HttpRequest.h"

namespace trelm::test {

// Stands in for the host's "HttpRequestFactory": its requests record what the client sends and
// answer from a queue of canned answers (then from the default answer: 200, empty body).
// Thread safety: every member may be called from any thread.
class FakeHttpRequestFactory : public Component {
public:
    struct Exchange {
        String url;
        Map<String, String> fields;
        SmartPtr<InputDataStream> upload;
    };
    // A failed `sendError` makes sendRequest fail with it.
    struct Answer {
        int status = 200;
        String body;
        uError sendError;
    };

    FakeHttpRequestFactory() : Component("HttpRequestFactory", "HttpRequestFactory") {}

    void queue(Answer answer);
    void queue(String body) { queue(Answer{200, std::move(body), uError()}); }
    void setDefault(Answer answer);
    // The factory message fails (no request is handed out).
    void refuseRequests(bool refuse);
    std::vector<Exchange> exchanges() const;
    void clear();

    // Records `exchange` and gives the next answer; called by the fake requests.
    Answer answer(Exchange const& exchange);

protected:
    uError handleMessage(IMessage& msg) override;

private:
    mutable std::mutex mutex_;  // guards the fields below
    std::vector<Exchange> exchanges_;
    std::deque<Answer> queue_;
    Answer default_;
    bool refuse_ = false;
};

}  // namespace trelm::test
