#include "FakeHttpRequestFactory.h"

#include "HttpObjectRequestMessage.h"

namespace trelm::test {
namespace {

class FakeHttpRequest : public HttpRequest {
public:
    explicit FakeHttpRequest(FakeHttpRequestFactory& factory) : factory_(factory) {}

    uError setup(String const& url) override {
        exchange_ = {url, {}};
        return TRELM_OK();
    }
    uError setPostData(Map<String, String> const& fields) override {
        exchange_.fields = fields;
        return TRELM_OK();
    }
    uError sendRequest() override {
        answer_ = factory_.answer(exchange_);
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
    FakeHttpRequestFactory::Exchange exchange_;
    FakeHttpRequestFactory::Answer answer_;
};

}  // namespace

void FakeHttpRequestFactory::queue(Answer answer) {
    std::lock_guard<std::mutex> lock(mutex_);
    queue_.push_back(std::move(answer));
}

std::vector<FakeHttpRequestFactory::Exchange> FakeHttpRequestFactory::exchanges() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return exchanges_;
}

FakeHttpRequestFactory::Answer FakeHttpRequestFactory::answer(Exchange const& exchange) {
    std::lock_guard<std::mutex> lock(mutex_);
    exchanges_.push_back(exchange);
    if (queue_.empty()) return Answer();
    Answer next = std::move(queue_.front());
    queue_.pop_front();
    return next;
}

uError FakeHttpRequestFactory::handleMessage(IMessage& msg) {
    if (msg.type() != IHttpRequestFactory::HttpObjectRequestMessage::kType) return TRELM_OK();
    static_cast<IHttpRequestFactory::HttpObjectRequestMessage&>(msg).request =
        SmartPtr<HttpRequest>(new FakeHttpRequest(*this));
    return TRELM_OK();
}

}  // namespace trelm::test
