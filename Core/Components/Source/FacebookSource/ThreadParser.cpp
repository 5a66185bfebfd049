#include "ThreadParser.h"

#include <cstdlib>

namespace trelm {
namespace {
constexpr char const* kRoot = "mailbox_getInbox_response";
constexpr char const* kThread = ".mailbox_getInbox_response.thread";
}  // namespace

ThreadParser::ThreadParser(Vector<FacebookLibrary::ThreadObj>& threads) : threads_(&threads) {}

ThreadParser::~ThreadParser() = default;

uError ThreadParser::parse(String const& xml) {
    depth_ = 0;
    appended_ = 0;
    errorCode_ = String();
    lastUpdate_ = String();
    return runParser(xml);
}

FacebookLibrary::ThreadObj* ThreadParser::current() {
    if (appended_ == 0 || threads_->empty()) return nullptr;
    return &(*threads_)[threads_->size() - 1];
}

uError ThreadParser::start(String const& name, Vector<String> const&) {
    if (depth_ == 0 && name != kRoot && name != "error_response") return TRELM_ERROR(kFailure);
    ++depth_;
    if (path() == kThread) {
        uError err = threads_->pushBack(FacebookLibrary::ThreadObj());
        if (err.failed()) return err;
        ++appended_;
        lastUpdate_ = String();
    }
    return TRELM_OK();
}

uError ThreadParser::end(String const& name) {
    if (name == "last_update" && path() == kThread) {
        if (FacebookLibrary::ThreadObj* thread = current()) thread->lastUpdate = std::atoi(lastUpdate_.cStr());
    } else if (name == "code" && path() == ".error_response") {
        return FacebookLibrary::resolveBaseFacebookErrorCode(errorCode_);
    }
    --depth_;
    return TRELM_OK();
}

uError ThreadParser::chars(String const& text) {
    String const& at = path();
    if (at == ".error_response.code") {
        errorCode_ += text;
        return TRELM_OK();
    }
    if (at == ".mailbox_getInbox_response.thread.last_update") {
        lastUpdate_ += text;
        return TRELM_OK();
    }
    FacebookLibrary::ThreadObj* thread = current();
    if (thread == nullptr) return TRELM_OK();
    if (at == ".mailbox_getInbox_response.thread.tid") {
        thread->threadId += text;
    } else if (at == ".mailbox_getInbox_response.thread.subject") {
        thread->subject += text;
    }
    return TRELM_OK();
}

}  // namespace trelm
