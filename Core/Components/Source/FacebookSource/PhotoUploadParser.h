#pragma once

#include "ServiceAnswerParser.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Reads the answer of "photos.upload":
//   <photos_upload_response><pid>..</pid><aid>..</aid>...</photos_upload_response>
// appending the text of ".photos_upload_response.pid" to the caller's photo id. An
// "error_response" document ends the parse at the end of its "code" element with the code's
// translation (FacebookLibrary::resolveBaseFacebookErrorCode); any other root gives kFailure.
//
// Lifetime: `photoId` must outlive the parser. Thread safety: one thread at a time.
class PhotoUploadParser : public ServiceAnswerParser {
public:
    explicit PhotoUploadParser(String& photoId);
    ~PhotoUploadParser() override;

    // Runs the parser over `xml`.
    uError parse(String const& xml);

protected:
    uError answerChars(String const& text) override;

private:
    String* photoId_;
};

}  // namespace trelm
