#include "ServiceAnswerParser.h"

#include "FacebookLibrary.h"

namespace trelm {

ServiceAnswerParser::ServiceAnswerParser(char const* root) : root_(root) {}

ServiceAnswerParser::~ServiceAnswerParser() = default;

uError ServiceAnswerParser::runAnswer(String const& xml) {
    depth_ = 0;
    errorCode_ = String();
    return runParser(xml);
}

uError ServiceAnswerParser::answerStart(String const&) { return TRELM_OK(); }

uError ServiceAnswerParser::answerEnd(String const&) { return TRELM_OK(); }

uError ServiceAnswerParser::start(String const& name, Vector<String> const&) {
    if (depth_ == 0 && name != root_ && name != "error_response") return TRELM_ERROR(kFailure);
    ++depth_;
    return answerStart(name);
}

uError ServiceAnswerParser::end(String const& name) {
    if (name == "code" && path() == ".error_response") {
        return FacebookLibrary::resolveBaseFacebookErrorCode(errorCode_);
    }
    --depth_;
    return answerEnd(name);
}

uError ServiceAnswerParser::chars(String const& text) {
    if (path() == ".error_response.code") {
        errorCode_ += text;
        return TRELM_OK();
    }
    return answerChars(text);
}

}  // namespace trelm
