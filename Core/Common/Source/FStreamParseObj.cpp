#include "trelm/FStreamParseObj.h"

#include <new>
#include <utility>

namespace trelm {

namespace {

constexpr std::string_view kRoot = "stream_get_response";
// Type of a status update post.
constexpr std::string_view kStatusType = "46";

}  // namespace

FStreamParseObj::FStreamParseObj() { useViews(); }

FStreamParseObj::~FStreamParseObj() = default;

uError FStreamParseObj::parse(String const& xml, Vector<Map<String, String>>& rows, unsigned& count) {
    rows_ = &rows;
    count_ = 0;
    places_.clear();
    field_ = nullptr;
    leafOpen_ = false;
    uError e = runParser(xml);
    rows_ = nullptr;
    post_ = PostFields();
    medium_ = MediumFields();
    photoMedium_ = MediumFields();
    count = count_;
    return e;
}

FStreamParseObj::Field* FStreamParseObj::fieldFor(Place parent, std::string_view name) {
    switch (parent) {
        case Place::Post:
            if (name == "type") return &post_.type;
            if (name == "post_id") return &post_.postId;
            if (name == "source_id") return &post_.sourceId;
            if (name == "created_time") return &post_.createdTime;
            if (name == "message") return &post_.message;
            return nullptr;
        case Place::Medium:
            if (name == "type") return &medium_.type;
            if (name == "src") return &medium_.src;
            if (name == "alt") return &medium_.alt;
            return nullptr;
        case Place::Photo:
            if (name == "pid") return &medium_.pid;
            if (name == "aid") return &medium_.aid;
            if (name == "owner") return &medium_.owner;
            return nullptr;
        default:
            return nullptr;
    }
}

uError FStreamParseObj::startView(std::string_view name, char const* const* attributes) {
    // depth() counts this element; places_ holds its ancestors.
    Place place = Place::Other;
    if (depth() == 1) {
        if (name != kRoot) {
            return TRELM_ERROR_MSG(kFailure,
                                   "unexpected root element <" + String(name) + ">, expected <" + String(kRoot) + ">");
        }
        place = Place::Root;
    } else {
        switch (places_.back()) {
            case Place::Root:
                if (name == "posts") place = Place::Posts;
                break;
            case Place::Posts:
                if (name == "stream_post") place = Place::Post;
                break;
            case Place::Post:
                if (name == "attachment") place = Place::Attachment;
                break;
            case Place::Attachment:
                if (name == "media") place = Place::Media;
                break;
            case Place::Media:
                if (name == "stream_media") place = Place::Medium;
                break;
            case Place::Medium:
                if (name == "photo") place = Place::Photo;
                break;
            default:
                break;
        }
    }
    if (place == Place::Post) {
        post_ = PostFields();
        photoMedium_ = MediumFields();
        mediaCount_ = 0;
        havePhoto_ = false;
    } else if (place == Place::Medium) {
        ++mediaCount_;
        medium_ = MediumFields();
    }
    field_ = depth() == 1 ? nullptr : fieldFor(places_.back(), name);
    try {
        places_.push_back(place);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    // Only a leaf that a row can take needs its text.
    text_.clear();
    setTextWanted(field_ != nullptr);
    leafOpen_ = true;
    nil_ = attributes[0] != nullptr && XMLParser::isNil(attributes);
    return TRELM_OK();
}

uError FStreamParseObj::endView(std::string_view /*name*/) {
    bool const leaf = leafOpen_ && !nil_;
    leafOpen_ = false;
    Field* const field = field_;
    field_ = nullptr;
    Place const place = places_.back();
    places_.pop_back();
    if (leaf && field != nullptr) {
        // A repeated leaf replaces the earlier one.
        field->text = String(std::move(text_));
        field->present = true;
        text_.clear();
    } else if (place == Place::Medium) {
        if (!havePhoto_ && medium_.type.present && medium_.type.text.view() == "photo") {
            // medium_ is emptied when the next medium starts.
            photoMedium_ = std::move(medium_);
            havePhoto_ = true;
        }
    } else if (place == Place::Post) {
        return finishPost();
    }
    return TRELM_OK();
}

uError FStreamParseObj::finishPost() {
    ++count_;
    // The texts are moved into the row (the fields are emptied when the next post starts).
    Map<String, String> row;
    auto take = [&row](char const* key, Field& field) -> uError {
        if (!field.present) return TRELM_OK();
        return row.insert(String(key), std::move(field.text));
    };
    if (havePhoto_) {
        TRELM_RETURN_IF_ERROR(take("aid", photoMedium_.aid));
        TRELM_RETURN_IF_ERROR(take("alt", photoMedium_.alt));
        TRELM_RETURN_IF_ERROR(take("created_time", post_.createdTime));
        TRELM_RETURN_IF_ERROR(row.insert(String("is_photo"), String("1")));
        TRELM_RETURN_IF_ERROR(take("owner", photoMedium_.owner));
        TRELM_RETURN_IF_ERROR(take("pid", photoMedium_.pid));
        TRELM_RETURN_IF_ERROR(take("src", photoMedium_.src));
    } else {
        bool const status = mediaCount_ == 0 || (post_.type.present && post_.type.text.view() == kStatusType);
        if (status) {
            TRELM_RETURN_IF_ERROR(take("created_time", post_.createdTime));
            TRELM_RETURN_IF_ERROR(row.insert(String("is_status"), String("1")));
            TRELM_RETURN_IF_ERROR(take("message", post_.message));
            TRELM_RETURN_IF_ERROR(take("post_id", post_.postId));
            TRELM_RETURN_IF_ERROR(take("source_id", post_.sourceId));
        } else {
            TRELM_RETURN_IF_ERROR(take("created_time", post_.createdTime));
            TRELM_RETURN_IF_ERROR(take("post_id", post_.postId));
        }
    }
    return rows_->pushBack(std::move(row));
}

uError FStreamParseObj::charsView(std::string_view text) {
    if (leafOpen_ && field_ != nullptr) {
        try {
            text_.append(text);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    return TRELM_OK();
}

}  // namespace trelm
