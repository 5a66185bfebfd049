#pragma once

#include <string>
#include <string_view>
#include <vector>

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
    uError startView(std::string_view name, char const* const* attributes) override;
    uError endView(std::string_view name) override;
    uError charsView(std::string_view text) override;

private:
    // Where an open element is, by the names of the elements around it. Other: anywhere else,
    // where nothing is read.
    enum class Place : unsigned char { Root, Posts, Post, Attachment, Media, Medium, Photo, Other };

    // One text a row can take; `present` when its element was read (the text may be empty).
    struct Field {
        String text;
        bool present = false;
    };
    // The leaves of a post that a row can take.
    struct PostFields {
        Field type, postId, sourceId, createdTime, message;
    };
    // The leaves of a medium that a row can take, with those of its photo element.
    struct MediumFields {
        Field type, src, alt, pid, aid, owner;
    };

    uError finishPost();
    // The field that the text of a leaf `name` under an element at `parent` goes to, or null.
    Field* fieldFor(Place parent, std::string_view name);

    // State of one parse; rows_ is valid during parse() only.
    Vector<Map<String, String>>* rows_ = nullptr;
    unsigned count_ = 0;
    std::vector<Place> places_;  // of the open elements, outermost first
    // The post being read, its number of media, the medium being read and the post's first photo
    // medium.
    PostFields post_;
    unsigned mediaCount_ = 0;
    MediumFields medium_;
    MediumFields photoMedium_;
    bool havePhoto_ = false;
    // The leaf being read: where its text goes (null: nowhere), and its text so far.
    Field* field_ = nullptr;
    std::string text_;
    bool leafOpen_ = false;
    bool nil_ = false;
};

}  // namespace trelm
