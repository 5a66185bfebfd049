#pragma once

#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// Reads the posts of a stream answer:
//   <stream_get_response><posts list="true"><stream_post>..</stream_post>..</posts>
//     <profiles list="true">..</profiles><albums list="true">..</albums></stream_get_response>
// One row per stream_post, in document order; profiles and albums are not read. A row is one of:
// - a photo post (the attachment holds a stream_media of type "photo"; the first such medium
//   counts): "is_photo" = "1", the medium's "src" and "alt", its photo's "pid", "aid" and
//   "owner", and the post's "created_time";
// - a status post (type 46, or an attachment without media): "is_status" = "1", "post_id",
//   "source_id", "created_time" and "message";
// - any other post: "post_id" and "created_time".
// Only the fields present in the post are set: a nil element (xsi:nil="true") or a missing one
// leaves its field out, an empty element gives "".
// A root element other than "stream_get_response" fails with kFailure.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API FStreamParseObj : public XMLParser {
public:
    FStreamParseObj();
    ~FStreamParseObj() override;

    // Appends one row per post to `rows`; `count` receives the number of posts in the answer.
    // Rows appended before a failure stay; `count` is then the number of posts read.
    uError parse(String const& xml, Vector<Map<String, String>>& rows, unsigned& count);

protected:
    uError start(String const& name, Vector<String> const& attributes) override;
    uError end(String const& name) override;
    uError chars(String const& text) override;

private:
    uError finishPost();

    // State of one parse; rows_ is valid during parse() only.
    Vector<Map<String, String>>* rows_ = nullptr;
    unsigned count_ = 0;
    // The post being read: its own leaf fields, its number of media, and the leaf fields of its
    // first photo medium ("src", "alt", "type", and "photo.pid" etc. for the photo element).
    Map<String, String> post_;
    unsigned mediaCount_ = 0;
    Map<String, String> medium_;
    Map<String, String> photoMedium_;
    bool havePhoto_ = false;
    // The leaf being read.
    String text_;
    bool leafOpen_ = false;
    bool nil_ = false;
};

}  // namespace trelm
