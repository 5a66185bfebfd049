#pragma once

#include "FacebookLibrary.h"
#include "ServiceAnswerParser.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Reads the answer of "mailbox.getThreadMessages":
//   <mailbox_getThreadMessages_response><message><mid>..</mid><tid>..</tid><author>..</author>
//     <body>..</body><time_sent>..</time_sent><has_attachment>..</has_attachment></message>...
// appending one MessageObj per "message" element, each with the caller's context. "time_sent" is
// converted with atoi when its element ends.
//
// The attachment flag: the attachment text is never collected (its test comes after the thread
// id's and can never match), so at the end of "has_attachment" a message gets the flag when the
// "time_sent" text read so far is a non-zero number. A message whose "has_attachment" precedes
// "time_sent" therefore never has the flag. Other readers of these records rely on this rule.
//
// An "error_response" document ends the parse at the end of its "code" element with the code's
// translation; any other root gives kFailure; a vector that can't grow gives kOutOfMemory.
// Records appended before a failure stay.
//
// Lifetime: `messages` must outlive the parser. Thread safety: one thread at a time.
class MessageParser : public ServiceAnswerParser {
public:
    MessageParser(Vector<FacebookLibrary::MessageObj>& messages, String const& context);
    ~MessageParser() override;

    uError parse(String const& xml);

protected:
    uError answerStart(String const& name) override;
    uError answerEnd(String const& name) override;
    uError answerChars(String const& text) override;

private:
    // The record being read; null before the first message of this parse.
    FacebookLibrary::MessageObj* current();

    // Constant after construction.
    String const context_;
    // State of one parse.
    unsigned appended_ = 0;  // records this parse appended
    String timeSent_;
    String attachment_;
    Vector<FacebookLibrary::MessageObj>* messages_;
};

}  // namespace trelm
