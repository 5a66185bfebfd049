#include "MessageParser.h"

#include <cstdlib>
#include <utility>

namespace trelm {
namespace {
constexpr char const* kRoot = "mailbox_getThreadMessages_response";
constexpr char const* kMessage = ".mailbox_getThreadMessages_response.message";
constexpr char const* kTid = ".mailbox_getThreadMessages_response.message.tid";
}  // namespace

MessageParser::MessageParser(Vector<FacebookLibrary::MessageObj>& messages, String const& context)
    : ServiceAnswerParser(kRoot), context_(context), messages_(&messages) {}

MessageParser::~MessageParser() = default;

uError MessageParser::parse(String const& xml) {
    appended_ = 0;
    timeSent_ = String();
    attachment_ = String();
    return runAnswer(xml);
}

FacebookLibrary::MessageObj* MessageParser::current() {
    if (appended_ == 0 || messages_->empty()) return nullptr;
    return &(*messages_)[messages_->size() - 1];
}

uError MessageParser::answerStart(String const&) {
    if (path() == kMessage) {
        FacebookLibrary::MessageObj message;
        message.context = context_;
        TRELM_RETURN_IF_ERROR(messages_->pushBack(std::move(message)));
        ++appended_;
        timeSent_ = String();
    }
    return TRELM_OK();
}

uError MessageParser::answerEnd(String const& name) {
    String const& at = path();
    if (name == "time_sent" && at == kMessage) {
        if (FacebookLibrary::MessageObj* message = current()) message->timeSent = std::atoi(timeSent_.cStr());
    } else if (name == "has_attachment" && at == kMessage) {
        if (FacebookLibrary::MessageObj* message = current()) {
            message->hasAttachment = attachment_ == "true" || std::atoi(timeSent_.cStr()) != 0;
        }
    }
    return TRELM_OK();
}

uError MessageParser::answerChars(String const& text) {
    String const& at = path();
    FacebookLibrary::MessageObj* message = current();
    if (message == nullptr) return TRELM_OK();
    // First match wins. The second thread-id test never matches, so attachment_ stays empty; the
    // has_attachment rule in end() depends on that.
    if (at == kTid) {
        message->threadId += text;
    } else if (at == ".mailbox_getThreadMessages_response.message.mid") {
        message->messageId += text;
    } else if (at == ".mailbox_getThreadMessages_response.message.author") {
        message->author += text;
    } else if (at == ".mailbox_getThreadMessages_response.message.body") {
        message->body += text;
    } else if (at == kTid) {
        attachment_ += text;
    } else if (at == ".mailbox_getThreadMessages_response.message.time_sent") {
        timeSent_ += text;
    }
    return TRELM_OK();
}

}  // namespace trelm
