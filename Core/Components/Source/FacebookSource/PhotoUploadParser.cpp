#include "PhotoUploadParser.h"

#include "FacebookLibrary.h"

namespace trelm {

PhotoUploadParser::PhotoUploadParser(String& photoId) : photoId_(&photoId) {}

PhotoUploadParser::~PhotoUploadParser() = default;

uError PhotoUploadParser::parse(String const& xml) {
    depth_ = 0;
    errorCode_ = String();
    return runParser(xml);
}

uError PhotoUploadParser::start(String const& name, Vector<String> const&) {
    if (depth_ == 0 && name != "photos_upload_response" && name != "error_response") {
        return TRELM_ERROR(kFailure);
    }
    ++depth_;
    return TRELM_OK();
}

uError PhotoUploadParser::end(String const& name) {
    if (name == "code" && path() == ".error_response") {
        return FacebookLibrary::resolveBaseFacebookErrorCode(errorCode_);
    }
    --depth_;
    return TRELM_OK();
}

uError PhotoUploadParser::chars(String const& text) {
    if (path() == ".error_response.code") {
        errorCode_ += text;
    } else if (path() == ".photos_upload_response.pid") {
        *photoId_ += text;
    }
    return TRELM_OK();
}

}  // namespace trelm
