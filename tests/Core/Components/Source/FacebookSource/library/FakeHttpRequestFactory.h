#pragma once

#include <deque>
#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/HttpRequest.h"

namespace trelm::test {

// Stands in for the host's "HttpRequestFactory": its requests record what the client sends and
// answer from a queue of canned answers (then 200 with an empty body).
// Thread safety: every member may be called from any thread.
class FakeHttpRequestFactory : public Component {
public:
    struct Exchange {
        String url;
        Map<String, String> fields;
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
    std::vector<Exchange> exchanges() const;

    // Records `exchange` and gives the next answer; called by the fake requests.
    Answer answer(Exchange const& exchange);

protected:
    uError handleMessage(IMessage& msg) override;

private:
    mutable std::mutex mutex_;  // guards the fields below
    std::vector<Exchange> exchanges_;
    std::deque<Answer> queue_;
};

}  // namespace trelm::test
