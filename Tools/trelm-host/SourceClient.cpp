#include "SourceClient.h"

#include <filesystem>
#include <functional>
#include <iostream>
#include <fstream>
#include <system_error>
#include <utility>

#include "GetUserSidMessage.h"
#include "trelm/Metadata.h"

namespace trelm {
namespace host {

namespace {

// The service's refusal of a session may arrive wrapped by the cursor or the source.
bool sessionRefused(uError const& e) {
    for (uError const* level = &e; level != nullptr; level = level->cause()) {
        if (level->code() == kNotSignedIn) return true;
    }
    return false;
}

}  // namespace

uError SourceClient::checkPhotoFile(std::string const& path, std::filesystem::path& file) {
    std::error_code ec;
    std::filesystem::path const absolute = std::filesystem::absolute(path, ec);
    std::filesystem::file_status const status = std::filesystem::status(absolute, ec);
    if (ec || !std::filesystem::exists(status)) {
        return TRELM_ERROR_MSG(kNotFound, "the photo " + path + " does not exist; give the path of an image file");
    }
    if (!std::filesystem::is_regular_file(status)) {
        return TRELM_ERROR_MSG(kInvalid, "the photo " + path + " is not a regular file (a folder?); give an image file");
    }
    std::ifstream in(absolute, std::ios::binary);
    if (!in) return TRELM_ERROR_MSG(kNotFound, "cannot read the photo " + path + "; check its permissions");
    unsigned char head[12] = {};
    in.read(reinterpret_cast<char*>(head), sizeof head);
    std::streamsize const got = in.gcount();
    if (got == 0) return TRELM_ERROR_MSG(kInvalid, "the photo " + path + " is empty; give an image file");
    // The formats the service took: JPEG, PNG, GIF, BMP and TIFF, told by their first bytes.
    auto starts = [&](std::initializer_list<unsigned char> magic) {
        if (got < static_cast<std::streamsize>(magic.size())) return false;
        unsigned i = 0;
        for (unsigned char byte : magic) {
            if (head[i++] != byte) return false;
        }
        return true;
    };
    bool const image = starts({0xff, 0xd8, 0xff}) || starts({0x89, 'P', 'N', 'G', '\r', '\n', 0x1a, '\n'}) ||
                       starts({'G', 'I', 'F', '8'}) || starts({'B', 'M'}) || starts({'I', 'I', 42, 0}) ||
                       starts({'M', 'M', 0, 42});
    if (!image) {
        return TRELM_ERROR_MSG(kInvalid, "the photo " + path +
                                             " is not an image the service takes (JPEG, PNG, GIF, BMP or TIFF)");
    }
    file = absolute;
    return TRELM_OK();
}

SourceClient::SourceClient(HostSession& session, Printer& printer)
    : session_(session), printer_(printer) {}

SourceClient::~SourceClient() = default;

uError SourceClient::open() {
    for (ComponentHost::Instance const& instance : session_.host().instances()) {
        source_ = session_.host().startedSource(instance.name);
        if (source_ != nullptr) {
            name_ = instance.name;
            break;
        }
    }
    if (source_ == nullptr) {
        return TRELM_ERROR_MSG(kNotFound,
                               "no data source is configured and started; give a configuration file that "
                               "names one with --config (the demo's is Tools/trelm-host/demo.json in the "
                               "source tree, share/trelm/demo.json where the host is installed)");
    }
    HostConfig::ComponentEntry const* entry = session_.entry(name_);
    if (entry == nullptr) return TRELM_ERROR_MSG(kNotFound, "no configuration entry for " + name_);
    signIn_.emplace(session_.host(), session_.loginListener(), *entry);

    bool stored = false;
    TRELM_RETURN_IF_ERROR(signIn_->sessionStored(stored));
    if (!stored && signIn_->possible()) return signIn();

    // The source took the stored session (or its configured one) with its configuration.
    IServiceSource::GetUserSidMessage user;
    uError e = user.send(name_);
    printer_.login(name_, e.code(), user.result, true);
    printer_.finish();
    return TRELM_OK();
}

uError SourceClient::signIn() {
    LoginListener::Status status;
    uError e = signIn_->signIn(status);
    ++signIns_;
    if (!status.tag.empty()) printer_.login(name_, status.code, status.userId, false);
    printer_.finish();
    return e;
}

uError SourceClient::paced(char const* what, std::function<uError()> const& step) {
    return session_.options().pacing.run(what, step, std::cerr);
}

template <class Operation>
uError SourceClient::retrying(Operation operation) {
    uError e = operation();
    if (!sessionRefused(e) || !signIn_->possible()) return e;
    uError signedIn = signIn();
    if (signedIn.failed()) {
        return TRELM_WRAP_MSG(kNotSignedIn, signedIn, "the service refused the session and signing in again failed");
    }
    return operation();
}

uError SourceClient::query(ItemQuery const& query, Listing& listing, ItemQuery::RowSink const& arrived,
                          Counted const& counted) {
    bool const completedLater = query.kind().type == Metadata::Object::TYPE_FRIEND_REQUEST;
    // A query made again after a new sign-in reads the same rows again: those already told are
    // not told twice.
    std::size_t told = 0;
    ItemQuery::RowSink tell;
    if (arrived && !completedLater) {
        tell = [&](std::size_t index, Record const& row) {
            if (index <= told) return;
            told = index;
            arrived(index, row);
        };
    }
    // The previous cursor's records leave the source's cache before the new query fills it.
    cursor_.reset();
    listed_.clear();
    Listing result;
    SmartPtr<IQueryItems::ICursor> cursor;
    uError e = retrying([&]() -> uError {
        result = Listing();
        cursor.reset();
        bool storedBefore = false;
        TRELM_RETURN_IF_ERROR(signIn_->sessionStored(storedBefore));
        IQueryItems::StartQueryMessage msg;
        TRELM_RETURN_IF_ERROR(query.fill(msg));
        TRELM_RETURN_IF_ERROR(paced("starting the query", [&] { return source_->startQuery(msg, query.interactive()); }));
        if (!msg.cursor) {
            return TRELM_ERROR_MSG(kFailure, name_ + " answered the query without a cursor");
        }
        cursor = msg.cursor;
        if (counted && query.kind().countable) {
            // The cursor keeps its count, so the one after the walk asks the service nothing.
            unsigned total = 0;
            TRELM_RETURN_IF_ERROR(paced("counting the rows", [&] { return cursor->numRows(total); }));
            counted(total);
        }
        uError step = query.walk(
            *cursor, result.rows,
            [this](char const* what, std::function<uError()> const& op) { return paced(what, op); }, tell);
        if (step.failed()) return step;
        if (result.rows.empty() && storedBefore) {
            // The stream cursor drops a failure of its first window and answers as if the stream
            // were empty; a refused session then shows only as the session the source forgot.
            bool storedAfter = true;
            TRELM_RETURN_IF_ERROR(signIn_->sessionStored(storedAfter));
            if (!storedAfter) return TRELM_ERROR_MSG(kNotSignedIn, name_ + " forgot its session while reading");
        }
        if (query.kind().type == Metadata::Object::TYPE_FRIEND_REQUEST) {
            TRELM_RETURN_IF_ERROR(addContactNames(result.rows));
        }
        if (query.kind().countable) {
            unsigned total = 0;
            TRELM_RETURN_IF_ERROR(paced("counting the rows", [&] { return cursor->numRows(total); }));
            result.total = total;
        }
        return TRELM_OK();
    });
    if (e.failed()) return e;
    if (arrived && completedLater) {
        for (std::size_t i = 0; i < result.rows.size(); ++i) arrived(i + 1, result.rows[i]);
    }
    cursor_ = std::move(cursor);
    listed_ = result.rows;
    listing = std::move(result);
    return TRELM_OK();
}

uError SourceClient::withSession(std::function<uError()> const& operation) { return retrying(operation); }

uError SourceClient::start(ItemQuery const& query, SmartPtr<IQueryItems::ICursor>& cursor) {
    cursor_.reset();
    listed_.clear();
    IQueryItems::StartQueryMessage msg;
    TRELM_RETURN_IF_ERROR(query.fill(msg));
    TRELM_RETURN_IF_ERROR(paced("starting the query", [&] { return source_->startQuery(msg, query.interactive()); }));
    if (!msg.cursor) return TRELM_ERROR_MSG(kFailure, name_ + " answered the query without a cursor");
    cursor = msg.cursor;
    return TRELM_OK();
}

uError SourceClient::addContactNames(std::vector<Record>& rows) {
    static String const idKey("core_event_contactid");
    static String const nameKey("core_event_contactname");
    std::string ids;
    for (Record const& row : rows) {
        Variant const* id = row.search(idKey);
        if (id == nullptr || row.contains(nameKey)) continue;
        ids += (ids.empty() ? "" : ",") + id->asString().str();
    }
    if (ids.empty()) return TRELM_OK();
    ItemQuery::Kind const* contactKind = ItemQuery::findKind(Metadata::Object::TYPE_CONTACT);
    if (contactKind == nullptr) return TRELM_ERROR_MSG(kFailure, "no contact kind to look names up with");
    ItemQuery contacts(*contactKind);
    TRELM_RETURN_IF_ERROR(contacts.where("core_contact_service_id=" + ids));
    IQueryItems::StartQueryMessage msg;
    TRELM_RETURN_IF_ERROR(contacts.fill(msg));
    TRELM_RETURN_IF_ERROR(source_->startQuery(msg, true));
    if (!msg.cursor) return TRELM_ERROR_MSG(kFailure, name_ + " answered the name lookup without a cursor");
    std::vector<Record> people;
    TRELM_RETURN_IF_ERROR(contacts.walk(*msg.cursor, people));
    Map<String, Variant> names;
    for (Record const& person : people) {
        Variant const* id = person.search("core_contact_service_id");
        Variant const* name = person.search("core_contact_name");
        if (id != nullptr && name != nullptr) TRELM_RETURN_IF_ERROR(names.insert(id->asString(), *name));
    }
    for (Record& row : rows) {
        Variant const* id = row.search(idKey);
        Variant const* name = id == nullptr ? nullptr : names.search(id->asString());
        if (name != nullptr && !row.contains(nameKey)) TRELM_RETURN_IF_ERROR(row.insert(nameKey, *name));
    }
    return TRELM_OK();
}

uError SourceClient::insert(Record& record) {
    Record const original = record;
    // The service refused a throttled or unavailable publishing call, so trying it again posts it
    // once; each try is reported, so the user knows a post was sent again.
    return retrying([&]() -> uError {
        return paced("publishing the item", [&] {
            record = original;
            return source_->insert(record);
        });
    });
}

uError SourceClient::postStatus(String const& text) {
    Record record;
    uError e = record.insert("core_object_type", Variant(static_cast<int>(Metadata::Object::TYPE_STATUS)));
    if (e.ok()) e = record.insert("core_event_text", Variant(text));
    if (e.ok()) e = insert(record);
    return e;
}

uError SourceClient::uploadPhoto(std::string const& path, String const& caption, String const& albumId,
                                 String& serviceId) {
    // The source reads the file only when the request goes out; a file that cannot be a photo is
    // better told here, by its name, before anything is sent.
    std::filesystem::path file;
    TRELM_RETURN_IF_ERROR(checkPhotoFile(path, file));
    Record record;
    uError e = record.insert("core_object_type", Variant(static_cast<int>(Metadata::Object::TYPE_MEDIA)));
    if (e.ok()) e = record.insert("media_uri", Variant(String(file.string())));
    if (e.ok() && !caption.empty()) e = record.insert("media_notes", Variant(caption));
    if (e.ok() && !albumId.empty()) e = record.insert("facebook_media_album_service_id", Variant(albumId));
    if (e.ok()) e = insert(record);
    if (e.failed()) return e;
    Variant const* id = record.search("core_service_id");
    String text;
    if (id == nullptr || id->as(text).failed() || text.empty()) {
        return TRELM_ERROR_MSG(kFailure, name_ + " uploaded the photo but gave back no core_service_id");
    }
    serviceId = text;
    return TRELM_OK();
}

uError SourceClient::retrieve(GUID const& guid, Record& record) {
    std::vector<Record> found{record};
    TRELM_RETURN_IF_ERROR(source_->retrieve(guid, found[0], false));
    // A friend request was listed with its requester's name, and comes back with it.
    Variant const* type = found[0].search("core_object_type");
    if (type != nullptr && type->asInt32() == Metadata::Object::TYPE_FRIEND_REQUEST) {
        TRELM_RETURN_IF_ERROR(retrying([&] { return addContactNames(found); }));
    }
    record = std::move(found[0]);
    return TRELM_OK();
}

SourceClient::Record const* SourceClient::listed(std::size_t n) const {
    if (n == 0 || n > listed_.size()) return nullptr;
    return &listed_[n - 1];
}

}  // namespace host
}  // namespace trelm
