#include "AttachmentWriter.h"

#include "SqliteDatabase.h"
#include "SqliteStatement.h"

namespace emu {

bool AttachmentWriter::write(const std::string& postId, const std::optional<std::string>& name,
                             const std::optional<std::string>& href, const std::optional<std::string>& caption,
                             const std::optional<std::string>& description, XmlNode& attachment, std::string& error) {
    sqlite3_stmt* raw = db_.prepareCached(
        "SELECT href, alt, type, src, photo_aid, photo_pid, photo_owner, idx, width, height "
        "FROM stream_media WHERE post_id = ? ORDER BY idx",
        error);
    if (!raw) return false;
    SqliteStatement media(raw);
    media.bind(1, postId);
    XmlNode* list = nullptr;
    while (media.step()) {
        if (!list) list = &attachment.addList("media");
        XmlNode& m = list->add("stream_media");
        m.add("href", media.getText(0));
        m.add("alt", media.getText(1));
        m.add("type", media.getText(2));
        m.add("src", media.getText(3));
        if (!media.isNull(5)) {
            XmlNode& photo = m.add("photo");
            photo.add("aid", media.getText(4));
            photo.add("pid", media.getText(5));
            photo.add("owner", media.getText(6));
            photo.add("index", media.getText(7));
            photo.add("width", media.getText(8));
            photo.add("height", media.getText(9));
        }
    }
    if (!media.ok()) {
        error = db_.lastError();
        return false;
    }
    if (name) attachment.add("name", *name);
    if (href) attachment.add("href", *href);
    if (caption) attachment.add("caption", *caption);
    if (description) attachment.add("description", *description);
    return true;
}

}  // namespace emu
