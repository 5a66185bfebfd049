// Writes a stream post's attachment: its media rows and its own fields.
#pragma once

#include <optional>
#include <string>

#include "XmlNode.h"

namespace emu {

class SqliteDatabase;

// Holds a reference to the database, which must outlive it. Not thread-safe: callers hold the
// store's lock.
class AttachmentWriter {
public:
    explicit AttachmentWriter(SqliteDatabase& db) : db_(db) {}

    // Fills `attachment` (already named) with <media list="true"> of <stream_media> {href, alt,
    // type, src[, photo {aid, pid, owner, index, width, height}]} and then the post's name, href,
    // caption and description when set. A post with neither media nor fields leaves it empty.
    // Returns false and sets `error` when the database fails.
    bool write(const std::string& postId, const std::optional<std::string>& name,
               const std::optional<std::string>& href, const std::optional<std::string>& caption,
               const std::optional<std::string>& description, XmlNode& attachment, std::string& error);

private:
    SqliteDatabase& db_;
};

}  // namespace emu
