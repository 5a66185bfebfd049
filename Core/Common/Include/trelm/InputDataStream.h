#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Names a local file to upload (the file part of a multipart request, see HttpRequest).
// The file is not opened here; HttpRequest reads it when the request is sent.
//
// Thread safety: a plain value; not guarded.
class TRELM_API InputDataStream {
public:
    InputDataStream();
    ~InputDataStream();

    // `uri` is a local path ("/tmp/photo.jpg") or a file URI ("file:///tmp/photo%201.jpg",
    // "file://localhost/tmp/x.jpg"; percent escapes are decoded). An empty text, another scheme
    // or a file URI naming a remote host gives kInvalid and leaves the stream as it was.
    uError setUri(String const& uri);

    // The text given to setUri ("" before).
    String const& uri() const noexcept { return uri_; }
    // The local path it names ("" before setUri).
    String const& path() const noexcept { return path_; }

private:
    String uri_;
    String path_;
};

}  // namespace trelm
