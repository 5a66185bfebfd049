#include "trelm/FStreamParseObj.h"

namespace trelm {

namespace {

char const kRoot[] = "stream_get_response";
char const kPostsPath[] = ".stream_get_response.posts";
char const kPostPath[] = ".stream_get_response.posts.stream_post";
char const kMediaPath[] = ".stream_get_response.posts.stream_post.attachment.media";
char const kMediumPath[] = ".stream_get_response.posts.stream_post.attachment.media.stream_media";
char const kPhotoPath[] = ".stream_get_response.posts.stream_post.attachment.media.stream_media.photo";
// Type of a status update post.
char const kStatusType[] = "46";

// Moves src[key] to dst[as] when present (src is cleared before it is used again).
uError copyField(Map<String, String>& src, char const* key, Map<String, String>& dst, char const* as) {
    String* value = src.search(String(key));
    if (value == nullptr) return TRELM_OK();
    return dst.insert(String(as), std::move(*value));
}

// The leaves of a post and of a medium that a row can take; the others are not kept.
bool isKeptPostField(String const& name) {
    return name == "type" || name == "post_id" || name == "source_id" || name == "created_time" || name == "message";
}
bool isKeptMediumField(String const& name) { return name == "type" || name == "src" || name == "alt"; }
bool isKeptPhotoField(String const& name) { return name == "pid" || name == "aid" || name == "owner"; }

}  // namespace

FStreamParseObj::FStreamParseObj() = default;

FStreamParseObj::~FStreamParseObj() = default;

uError FStreamParseObj::parse(String const& xml, Vector<Map<String, String>>& rows, unsigned& count) {
    rows_ = &rows;
    count_ = 0;
    leafOpen_ = false;
    uError e = runParser(xml);
    rows_ = nullptr;
    post_.clear();
    medium_.clear();
    photoMedium_.clear();
    count = count_;
    return e;
}

uError FStreamParseObj::start(String const& name, Vector<String> const& attributes) {
    if (depth() == 1 && name != kRoot) {
        return TRELM_ERROR_MSG(kFailure, "unexpected root element <" + name + ">, expected <" + kRoot + ">");
    }
    if (path() == kPostPath) {
        post_.clear();
        photoMedium_.clear();
        mediaCount_ = 0;
        havePhoto_ = false;
    } else if (path() == kMediumPath) {
        ++mediaCount_;
        medium_.clear();
    }
    text_ = String();
    leafOpen_ = true;
    nil_ = XMLParser::isNil(attributes);
    return TRELM_OK();
}

uError FStreamParseObj::end(String const& name) {
    bool const leaf = leafOpen_ && !nil_;
    leafOpen_ = false;
    // path() is the parent's path here.
    String const& parent = path();
    if (parent == kPostPath) {
        if (leaf && isKeptPostField(name)) return post_.insert(name, std::move(text_));
    } else if (parent == kMediumPath) {
        if (leaf && isKeptMediumField(name)) return medium_.insert(name, std::move(text_));
    } else if (parent == kPhotoPath) {
        if (leaf && isKeptPhotoField(name)) return medium_.insert("photo." + name, std::move(text_));
    } else if (parent == kMediaPath && name == "stream_media") {
        String const* type = medium_.search(String("type"));
        if (!havePhoto_ && type != nullptr && *type == "photo") {
            // medium_ is cleared when the next medium starts.
            photoMedium_ = std::move(medium_);
            havePhoto_ = true;
        }
    } else if (parent == kPostsPath && name == "stream_post") {
        return finishPost();
    }
    return TRELM_OK();
}

uError FStreamParseObj::finishPost() {
    ++count_;
    Map<String, String> row;
    uError e;
    if (havePhoto_) {
        e = row.insert(String("is_photo"), String("1"));
        if (e.ok()) e = copyField(photoMedium_, "photo.pid", row, "pid");
        if (e.ok()) e = copyField(photoMedium_, "photo.aid", row, "aid");
        if (e.ok()) e = copyField(photoMedium_, "photo.owner", row, "owner");
        if (e.ok()) e = copyField(photoMedium_, "src", row, "src");
        if (e.ok()) e = copyField(photoMedium_, "alt", row, "alt");
        if (e.ok()) e = copyField(post_, "created_time", row, "created_time");
    } else {
        String const* type = post_.search(String("type"));
        bool const status = mediaCount_ == 0 || (type != nullptr && *type == kStatusType);
        if (status) {
            e = row.insert(String("is_status"), String("1"));
            if (e.ok()) e = copyField(post_, "post_id", row, "post_id");
            if (e.ok()) e = copyField(post_, "source_id", row, "source_id");
            if (e.ok()) e = copyField(post_, "created_time", row, "created_time");
            if (e.ok()) e = copyField(post_, "message", row, "message");
        } else {
            e = copyField(post_, "post_id", row, "post_id");
            if (e.ok()) e = copyField(post_, "created_time", row, "created_time");
        }
    }
    if (e.failed()) return e;
    return rows_->pushBack(std::move(row));
}

uError FStreamParseObj::chars(String const& text) {
    if (leafOpen_) text_ += text;
    return TRELM_OK();
}

}  // namespace trelm
