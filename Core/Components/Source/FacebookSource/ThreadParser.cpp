#include "ThreadParser.h"

#include <cstdlib>

namespace trelm {
namespace {
constexpr char const* kRoot = "mailbox_getInbox_response";
constexpr char const* kThread = ".mailbox_getInbox_response.thread";
}  // namespace

ThreadParser::ThreadParser(Vector<FacebookLibrary::ThreadObj>& threads)
    : ServiceAnswerParser(kRoot), threads_(&threads) {}

ThreadParser::~ThreadParser() = default;

uError ThreadParser::parse(String const& xml) {
    appended_ = 0;
    lastUpdate_ = String();
    return runAnswer(xml);
}

FacebookLibrary::ThreadObj* ThreadParser::current() {
    if (appended_ == 0 || threads_->empty()) return nullptr;
    return &(*threads_)[threads_->size() - 1];
}

uError ThreadParser::answerStart(String const&) {
    if (path() == kThread) {
        TRELM_RETURN_IF_ERROR(threads_->pushBack(FacebookLibrary::ThreadObj()));
        ++appended_;
        lastUpdate_ = String();
    }
    return TRELM_OK();
}

uError ThreadParser::answerEnd(String const& name) {
    if (name == "last_update" && path() == kThread) {
        if (FacebookLibrary::ThreadObj* thread = current()) thread->lastUpdate = std::atoi(lastUpdate_.cStr());
    }
    return TRELM_OK();
}

uError ThreadParser::answerChars(String const& text) {
    String const& at = path();
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
