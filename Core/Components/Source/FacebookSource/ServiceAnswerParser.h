#pragma once

#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// The common part of the client's own answer parsers: the document's root must be the call's
// answer element or "error_response" (any other root gives kFailure), and an error document ends
// the parse at the end of its "code" element with that code's translation
// (FacebookLibrary::resolveBaseFacebookErrorCode). Everything else of the document goes to the
// subclass's answerStart / answerEnd / answerChars, with path() as XMLParser keeps it.
//
// Lifetime: `root` must have static storage. Thread safety: one thread at a time.
class ServiceAnswerParser : public XMLParser {
protected:
    explicit ServiceAnswerParser(char const* root);
    ~ServiceAnswerParser() override;

    // Forgets the state of an earlier run and parses `xml`.
    uError runAnswer(String const& xml);

    // Called after the element is pushed on the path.
    virtual uError answerStart(String const& name);
    // Called after the element is popped from the path.
    virtual uError answerEnd(String const& name);
    // Text outside the error code.
    virtual uError answerChars(String const& text) = 0;

private:
    uError start(String const& name, Vector<String> const& attributes) final;
    uError end(String const& name) final;
    uError chars(String const& text) final;

    // Constant after construction.
    char const* const root_;
    // State of one parse.
    unsigned depth_ = 0;
    String errorCode_;
};

}  // namespace trelm
