#pragma once

#include <deque>
#include <mutex>
#include <vector>

#include "Component.h"
#include "HttpObjectRequestMessage.h"
#include "trelm/HttpRequest.h"

namespace trelm::test {

// Stands in for the host's "HttpRequestFactory": its requests record the fields the client posts
// and answer from a queue of canned answers (then 200 with an empty body).
// Thread safety: every member may be called from any thread.
class FakeHttpRequestFactory : public Component {
public:
    using Fields = Map<String, String>;
    // A failed `sendError` makes sendRequest fail with it.
    struct Answer {
        int status = 200;
        String body;
        uError sendError;
    };

    FakeHttpRequestFactory() : Component("HttpRequestFactory", "HttpRequestFactory") {}

    void queue(Answer answer) {
        std::lock_guard<std::mutex> lock(mutex_);
        queue_.push_back(std::move(answer));
    }
    void queue(String body) { queue(Answer{200, std::move(body), uError()}); }
    // The fields of every request sent so far, in order.
    std::vector<Fields> exchanges() const {
        std::lock_guard<std::mutex> lock(mutex_);
        return exchanges_;
    }

protected:
    uError handleMessage(IMessage& msg) override {
        if (msg.type() != IHttpRequestFactory::HttpObjectRequestMessage::kType) return TRELM_OK();
        static_cast<IHttpRequestFactory::HttpObjectRequestMessage&>(msg).request =
            SmartPtr<HttpRequest>(new Request(*this));
        return TRELM_OK();
    }

private:
    // Records `fields` and gives the next answer.
    Answer answer(Fields const& fields) {
        std::lock_guard<std::mutex> lock(mutex_);
        exchanges_.push_back(fields);
        if (queue_.empty()) return Answer();
        Answer next = std::move(queue_.front());
        queue_.pop_front();
        return next;
    }

    class Request : public HttpRequest {
    public:
        explicit Request(FakeHttpRequestFactory& factory) : factory_(factory) {}
        uError setup(String const&) override { return TRELM_OK(); }
        uError setPostData(Fields const& fields) override {
            fields_ = fields;
            return TRELM_OK();
        }
        uError sendRequest() override {
            answer_ = factory_.answer(fields_);
            return answer_.sendError;
        }
        // Read by the client only after a successful sendRequest.
        uError getResponseCode(int& code) override {
            code = answer_.status;
            return TRELM_OK();
        }
        uError getResponseData(String& data) override {
            data = answer_.body;
            return TRELM_OK();
        }
        uError disconnect() override { return TRELM_OK(); }

    private:
        FakeHttpRequestFactory& factory_;
        Fields fields_;
        Answer answer_;
    };

    mutable std::mutex mutex_;  // guards the fields below
    std::vector<Fields> exchanges_;
    std::deque<Answer> queue_;
};

}  // namespace trelm::test
