#include "PhotoUploadParser.h"

namespace trelm {

PhotoUploadParser::PhotoUploadParser(String& photoId)
    : ServiceAnswerParser("photos_upload_response"), photoId_(&photoId) {}

PhotoUploadParser::~PhotoUploadParser() = default;

uError PhotoUploadParser::parse(String const& xml) { return runAnswer(xml); }

uError PhotoUploadParser::answerChars(String const& text) {
    if (path() == ".photos_upload_response.pid") *photoId_ += text;
    return TRELM_OK();
}

}  // namespace trelm
