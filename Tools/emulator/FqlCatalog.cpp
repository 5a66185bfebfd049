#include "FqlCatalog.h"

namespace emu {

bool equalsIgnoreCase(std::string_view a, std::string_view b) {
    if (a.size() != b.size()) return false;
    for (std::size_t i = 0; i < a.size(); ++i) {
        char x = a[i], y = b[i];
        if (x >= 'A' && x <= 'Z') x = static_cast<char>(x - 'A' + 'a');
        if (y >= 'A' && y <= 'Z') y = static_cast<char>(y - 'A' + 'a');
        if (x != y) return false;
    }
    return true;
}

const FqlField* FqlColumn::field(std::string_view fieldName) const {
    for (const FqlField& f : fields)
        if (equalsIgnoreCase(f.name, fieldName)) return &f;
    return nullptr;
}

const FqlColumn* FqlTable::column(std::string_view columnName) const {
    for (const FqlColumn& c : columns)
        if (equalsIgnoreCase(c.name, columnName)) return &c;
    return nullptr;
}

namespace {

FqlColumn stored(std::string name, FqlType type, bool indexable = false) {
    FqlColumn c;
    c.name = name;
    c.type = type;
    c.indexable = indexable;
    c.physical = name;
    c.sql = "$." + name;
    return c;
}

FqlColumn computed(std::string name, FqlType type, std::string sql) {
    FqlColumn c;
    c.name = std::move(name);
    c.type = type;
    c.sql = std::move(sql);
    return c;
}

FqlColumn structured(std::string name, FqlShape shape, std::vector<FqlField> fields) {
    FqlColumn c;
    c.name = std::move(name);
    c.shape = shape;
    c.fields = std::move(fields);
    return c;
}

// A column the service had and this one keeps no data for: always the empty text.
FqlColumn unknown(std::string name) { return computed(std::move(name), FqlType::Text, "''"); }

FqlColumn hidden(FqlColumn c, int bit) {
    c.hiddenBit = bit;
    return c;
}

FqlColumn referencing(FqlColumn c, std::string table, std::string textKey = {}) {
    c.references = std::move(table);
    c.textKey = std::move(textKey);
    return c;
}

// Albums, photos and their tags follow the album's audience: everyone, the owner's friends, or
// the owner alone ("custom").
std::string audience(const std::string& alias) {
    return "(" + alias + ".visible = 'everyone' OR " + alias + ".owner = @ OR (" + alias +
           ".visible = 'friends' AND EXISTS (SELECT 1 FROM friend v WHERE v.uid1 = @ AND v.uid2 = " + alias +
           ".owner)))";
}

constexpr FqlType I = FqlType::Integer;
constexpr FqlType T = FqlType::Text;
constexpr FqlType R = FqlType::Real;

// "friend_request.uid_from" is stored as a number and answered and compared as text (ours): the
// client pages through requests with a key condition "uid_from > '<id> '" next to the order
// concat(uid_from, ' '), which only agree when the comparison is a text one.
FqlColumn requesterColumn() {
    FqlColumn c = stored("uid_from", T);
    c.sql = "CAST($.uid_from AS TEXT)";
    return c;
}

}  // namespace

FqlCatalog::FqlCatalog() {
    // User ids of friends, requesters and owners always name an existing user; the client's
    // text sort key ("<uid> ") is stored beside the friend's and the requester's id.
    tables_.push_back(FqlTable{
        "user",
        {
            stored("uid", I, true),
            stored("name", T, true),
            stored("first_name", T),
            stored("last_name", T),
            computed("pic_small", T, "('http://pics.trelm.example/t/' || $.uid || '.jpg')"),
            computed("pic_big", T, "('http://pics.trelm.example/n/' || $.uid || '.jpg')"),
            computed("pic_square", T, "('http://pics.trelm.example/q/' || $.uid || '.jpg')"),
            computed("pic", T, "('http://pics.trelm.example/s/' || $.uid || '.jpg')"),
            computed("profile_url", T, "('http://www.trelm.example/profile.php?id=' || $.uid)"),
            hidden(stored("birthday", T), 1),
            stored("sex", T),
            hidden(structured("current_location", FqlShape::Struct,
                              {{"city", T, "$.city"}, {"state", T, "$.state"}, {"country", T, "$.country"},
                               {"zip", T, "$.zip"}}),
                   2),
            hidden(structured("status", FqlShape::Struct,
                              {{"message", T, "$.status_message"}, {"time", I, "$.status_time"},
                               {"status_id", I, "$.status_id"}}),
                   8),
            stored("locale", T),
            hidden(stored("about_me", T), 4),
            computed("pic_small_with_logo", T, "('http://pics.trelm.example/t/' || $.uid || '.jpg')"),
            computed("pic_big_with_logo", T, "('http://pics.trelm.example/n/' || $.uid || '.jpg')"),
            computed("pic_square_with_logo", T, "('http://pics.trelm.example/q/' || $.uid || '.jpg')"),
            computed("pic_with_logo", T, "('http://pics.trelm.example/s/' || $.uid || '.jpg')"),
            // The rest of the service's user fields: this service keeps no data for them, and
            // answers each as an empty element, as the service did for a field a user left empty.
            unknown("activities"), unknown("affiliations"), unknown("allowed_restrictions"),
            unknown("birthday_date"), unknown("books"), unknown("education_history"), unknown("email"),
            unknown("email_hashes"), unknown("family"), unknown("has_added_app"), unknown("hometown_location"),
            unknown("hs_info"), unknown("interests"), unknown("is_app_user"), unknown("is_blocked"),
            unknown("meeting_for"), unknown("meeting_sex"), unknown("movies"), unknown("music"),
            unknown("name_format"), unknown("notes_count"), unknown("online_presence"), unknown("political"),
            unknown("profile_blurb"), unknown("profile_update_time"), unknown("proxied_email"), unknown("quotes"),
            unknown("relationship_status"), unknown("religion"), unknown("significant_other_id"),
            unknown("timezone"), unknown("tv"), unknown("username"), unknown("verified"), unknown("wall_count"),
            unknown("website"), unknown("work_history"),
        },
        {{"uid"}},
        {"uid"},
        "",
    });
    tables_.push_back(FqlTable{
        "friend",
        {referencing(stored("uid1", I, true), "user"), referencing(stored("uid2", I, true), "user", "key2")},
        {{"uid1", "uid2"}},
        {"uid1", "uid2"},
        "",
    });
    tables_.push_back(FqlTable{
        "friend_request",
        {referencing(stored("uid_to", I, true), "user"), referencing(requesterColumn(), "user", "from_key"),
         stored("time", I), stored("message", T), stored("unread", I)},
        {{"uid_to", "uid_from"}},
        {"uid_to", "uid_from"},
        "$.uid_to = @",
    });
    tables_.push_back(FqlTable{
        "album",
        {stored("aid", T, true), referencing(stored("owner", I, true), "user"), stored("cover_pid", T, true),
         stored("name", T), stored("created", I), stored("modified", I), stored("description", T),
         stored("location", T), stored("link", T), stored("size", I), stored("visible", T), stored("type", T)},
        {{"aid"}},
        {"aid"},
        audience("$"),
    });
    tables_.push_back(FqlTable{
        "photo",
        {stored("pid", T, true), referencing(stored("aid", T, true), "album"), referencing(stored("owner", I, true), "user"),
         stored("src_small", T), stored("src_big", T), stored("src", T), stored("link", T), stored("caption", T),
         stored("created", I), stored("modified", I)},
        {{"pid"}},
        {"pid"},
        audience("$"),
    });
    tables_.push_back(FqlTable{
        "photo_tag",
        {referencing(stored("pid", T, true), "photo"), stored("subject", I, true), stored("text", T),
         stored("xcoord", R), stored("ycoord", R), stored("created", I)},
        {{"pid", "subject"}},
        {"pid", "subject"},
        "EXISTS (SELECT 1 FROM photo vp WHERE vp.pid = $.pid AND " + audience("vp") + ")",
    });
    tables_.push_back(FqlTable{
        "stream",
        {stored("post_id", T, true), referencing(stored("source_id", I, true), "user"), stored("filter_key", T, true),
         computed("viewer_id", I, "@"), stored("actor_id", I), stored("target_id", I), stored("type", I),
         stored("app_id", I), stored("attribution", T), stored("message", T),
         structured("attachment", FqlShape::StreamAttachment,
                    {{"post_id", T, "$.post_id"}, {"name", T, "$.att_name"}, {"href", T, "$.att_href"},
                     {"caption", T, "$.att_caption"}, {"description", T, "$.att_description"}}),
         stored("created_time", I), stored("updated_time", I)},
        {{"post_id"}},
        {"post_id"},
        "($.source_id = @ OR $.actor_id = @ OR EXISTS (SELECT 1 FROM friend v WHERE v.uid1 = @ AND v.uid2 = "
        "$.source_id))",
    });
    FqlColumn recipients = stored("recipients", T);
    recipients.shape = FqlShape::UidList;
    tables_.push_back(FqlTable{
        "thread",
        {stored("thread_id", I, true), stored("folder_id", I, true), stored("subject", T), recipients,
         stored("updated_time", I), stored("message_count", I), stored("snippet", T), stored("snippet_author", I),
         stored("unread", I)},
        {{"thread_id"}},
        {"thread_id"},
        "$.owner = @",
    });
    tables_.push_back(FqlTable{
        "message",
        {stored("message_id", T, true), referencing(stored("thread_id", I, true), "thread"), stored("author_id", I),
         stored("body", T), stored("created_time", I),
         structured("attachment", FqlShape::Struct, {{"name", T, "$.att_name"}, {"href", T, "$.att_href"}})},
        {{"message_id"}},
        {"message_id"},
        "EXISTS (SELECT 1 FROM thread v WHERE v.thread_id = $.thread_id AND v.owner = @)",
    });
}

const FqlCatalog& FqlCatalog::instance() {
    static const FqlCatalog catalog;
    return catalog;
}

const FqlTable* FqlCatalog::table(std::string_view tableName) const {
    for (const FqlTable& t : tables_)
        if (equalsIgnoreCase(t.name, tableName)) return &t;
    return nullptr;
}

}  // namespace emu
