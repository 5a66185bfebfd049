#pragma once

#include "FacebookLibrary.h"
#include "ServiceAnswerParser.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Reads the answer of "mailbox.getInbox":
//   <mailbox_getInbox_response><thread><tid>..</tid><subject>..</subject>
//     <last_update>..</last_update>...</thread>...</mailbox_getInbox_response>
// appending one ThreadObj per "thread" element (other children are ignored). "last_update" is
// converted with atoi when its element ends. An "error_response" document ends the parse at the
// end of its "code" element with the code's translation; any other root gives kFailure; a vector
// that can't grow gives kOutOfMemory. Records appended before a failure stay.
//
// Lifetime: `threads` must outlive the parser. Thread safety: one thread at a time.
class ThreadParser : public ServiceAnswerParser {
public:
    explicit ThreadParser(Vector<FacebookLibrary::ThreadObj>& threads);
    ~ThreadParser() override;

    uError parse(String const& xml);

protected:
    uError answerStart(String const& name) override;
    uError answerEnd(String const& name) override;
    uError answerChars(String const& text) override;

private:
    // The record being read; null before the first thread of this parse.
    FacebookLibrary::ThreadObj* current();

    // State of one parse.
    unsigned appended_ = 0;  // records this parse appended
    String lastUpdate_;
    Vector<FacebookLibrary::ThreadObj>* threads_;
};

}  // namespace trelm
