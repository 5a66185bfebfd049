#include "FacebookSource.h"

#include <utility>

#include "AlbumCursor.h"
#include "ContactCursor.h"
#include "CursorBase.h"
#include "FStreamCursor.h"
#include "FriendRequestCursor.h"
#include "GetRuntimeConfigurationMessage.h"
#include "GetUserSidMessage.h"
#include "MappingCache.h"
#include "MediaCursor.h"
#include "MessageCursor.h"
#include "PhotoEventCursor.h"
#include "PhotoEventWrappedCursor.h"
#include "PhotoTagCursor.h"
#include "trelm/InputDataStream.h"
#include "trelm/Set.h"
#include "trelm/Trace.h"
#include "trelm/Vector.h"

namespace trelm {

namespace {

// Configuration keys of the source's group (and of its runtime configuration).
constexpr char const* kAppKey = "facebook_source_appkey";
constexpr char const* kAppSecret = "facebook_source_appsecret";
constexpr char const* kLogin = "facebook_source_login";
constexpr char const* kPassword = "facebook_source_password";
constexpr char const* kSessionUser = "facebook_source_session_user";
constexpr char const* kSessionId = "facebook_source_session_id";
constexpr char const* kSessionSecret = "facebook_source_session_secret";
constexpr char const* kWipeComponents = "wipeComponents";
constexpr char const* kWakeupComponents = "wakeupComponents";
constexpr char const* kHaveExtendedApi = "haveExtendedApi";

constexpr char const* kRuntimeConfiguration = "RuntimeConfiguration";

// Reports an error that the source cannot act on, one trace line per level of its chain.
void traceError(char const* what, uError const& err) { ::trelm::traceError("FacebookSource", what, err); }

// ---- Query dispatch ----

struct CursorArgs {
    SmartPtr<FacebookLibrary> library;
    SmartPtr<FacebookSource::MappingCache> cache;
    Vector<IQueryItems::Column> const& columns;
    Vector<IQueryItems::Constraint> const& constraints;
    String const& sourceId;
    std::int64_t position;  // -1 when the query gives none
};

using CursorMaker = SmartPtr<CursorBase> (*)(CursorArgs const& args);

SmartPtr<CursorBase> makeContactCursor(CursorArgs const& a) {
    return makeSmart<ContactCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, true, true);
}

SmartPtr<CursorBase> makeFriendRequestCursor(CursorArgs const& a) {
    return makeSmart<FriendRequestCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, true, true);
}

SmartPtr<CursorBase> makeMessageCursor(CursorArgs const& a) {
    return makeSmart<MessageCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, true);
}

// Albums, media and photo tags page unless the query gives a position: the cursor then asks once
// for everything changed since that time (PhotoLibraryCursor).
SmartPtr<CursorBase> makeAlbumCursor(CursorArgs const& a) {
    return makeSmart<AlbumCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, false, a.position);
}

SmartPtr<CursorBase> makeMediaCursor(CursorArgs const& a) {
    return makeSmart<MediaCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, false, a.position);
}

SmartPtr<CursorBase> makePhotoTagCursor(CursorArgs const& a) {
    return makeSmart<PhotoTagCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, false, a.position);
}

// Serves status posts, photo posts or both from the news stream, 75 posts a window.
SmartPtr<CursorBase> makeStreamCursor(CursorArgs const& a) {
    auto cursor = makeSmart<FStreamCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, true, true);
    cursor->setWindowSize(75);
    return cursor;
}

// Serves photo events: the photo cursor behind the wrapper that sorts photos of one second.
SmartPtr<CursorBase> makePhotoEventCursor(CursorArgs const& a) {
    auto inner = makeSmart<PhotoEventCursor>(a.library, a.cache, a.columns, a.constraints, a.sourceId, true, true);
    return makeSmart<PhotoEventWrappedCursor>(inner, a.library, a.cache, a.columns, a.constraints, a.sourceId, true);
}

// One object kind the source serves and the cursor that answers it.
struct CursorKind {
    int type;               // "core_object_type"
    bool needsInteractive;  // served only when the query's flag is true
    bool acceptsPosition;   // may be given a start position (its cursor then fetches unpaged)
    CursorMaker make;       // null: no cursor for this kind yet (kNotSupported)
};

// In the order in which a cursor is chosen; types 4 and 5 together are served by the stream
// cursor, which comes first.
constexpr CursorKind kCursorKinds[] = {
    {FacebookSource::kStatus, true, false, &makeStreamCursor},
    {FacebookSource::kPhotoEvent, true, false, &makePhotoEventCursor},
    {FacebookSource::kContact, true, false, &makeContactCursor},
    {FacebookSource::kAlbum, false, true, &makeAlbumCursor},
    {FacebookSource::kMedia, false, true, &makeMediaCursor},
    {FacebookSource::kFriendRequest, false, false, &makeFriendRequestCursor},
    {FacebookSource::kMessage, true, false, &makeMessageCursor},
    {FacebookSource::kPhotoTag, false, true, &makePhotoTagCursor},
};

CursorKind const* findKind(int type) {
    for (CursorKind const& kind : kCursorKinds) {
        if (kind.type == type) return &kind;
    }
    return nullptr;
}

// ---- Configuration changes ----

// What the runtime-configuration store answered for one key.
struct Watched {
    enum State { NotGiven, Given, Invalid };
    State state = NotGiven;
    String value;
};

Watched readWatched(Map<String, Variant> const& values, char const* key) {
    Watched w;
    Variant const* v = values.search(key);
    if (v == nullptr || v->empty()) return w;
    w.state = v->as(w.value).ok() ? Watched::Given : Watched::Invalid;
    return w;
}

bool anyChanged(ConfigurationChangedMessage const& msg, std::initializer_list<char const*> keys) {
    for (char const* key : keys) {
        if (msg.keys.contains(key)) return true;
    }
    return false;
}

// Asks "RuntimeConfiguration" for `keys` under `tag`.
uError readRuntimeConfiguration(String const& tag, std::initializer_list<char const*> keys,
                                Map<String, Variant>& values) {
    for (char const* key : keys) {
        uError err = values.insert(key, Variant());
        if (err.failed()) return TRELM_WRAP(kFailure, err);
    }
    GetRuntimeConfigurationMessage request(tag, values, 0);
    return request.send(kRuntimeConfiguration);
}

using Info = FacebookLibrary::ConnectionInfo;
using InfoGetter = uError (Info::*)(String&) const;

// Completes a pair of watched values (key and secret, login and password) for a setter: a member
// not given keeps the value the settings hold, empty when they hold none. False when the pair is
// to be left alone; `readError` then holds why, when the settings could not be read.
bool completePair(Info const& info, Watched const& first, Watched const& second, InfoGetter getFirst,
                  InfoGetter getSecond, String& firstValue, String& secondValue, uError& readError) {
    if (first.state == Watched::Invalid || second.state == Watched::Invalid) return false;
    if (first.state == Watched::NotGiven && second.state == Watched::NotGiven) return false;
    struct Member {
        Watched const& watched;
        InfoGetter get;
        String& out;
    };
    for (Member m : {Member{first, getFirst, firstValue}, Member{second, getSecond, secondValue}}) {
        if (m.watched.state == Watched::Given) {
            m.out = m.watched.value;
            continue;
        }
        String current;
        uError err = (info.*m.get)(current);
        if (err.failed() && err.code() != kNotSet) {
            readError = err;
            return false;
        }
        m.out = current;
    }
    return true;
}

}  // namespace

FacebookSource::FacebookSource(String name) : BaseSource(std::move(name), kComponentId) {}

FacebookSource::~FacebookSource() {
    StdMutexLock lock(mutex_);
    mappingCache_.reset();
    library_.reset();
    connectionInfo_.reset();
}

SmartPtr<FacebookLibrary::ConnectionInfo> FacebookSource::connectionInfoRef() const {
    StdMutexLock lock(mutex_);
    return connectionInfo_;
}

void FacebookSource::startedRefs(SmartPtr<FacebookLibrary>& library, SmartPtr<MappingCache>& cache) const {
    StdMutexLock lock(mutex_);
    library = library_;
    cache = mappingCache_;
}

// ---- Lifecycle ----

uError FacebookSource::sendConfigImpl(Configuration::Group const& group) {
    // Each step stands alone: a missing or malformed key leaves its setting unset and the next
    // step runs all the same. Only the last step's result is returned.
    auto info = makeSmart<FacebookLibrary::ConnectionInfo>(name());
    uError result;

    String appKey, appSecret;
    result = group.get(kAppKey).as(appKey);
    if (result.ok()) result = group.get(kAppSecret).as(appSecret);
    if (result.ok()) result = info->setAppConfig(appKey, appSecret);

    String login, password;
    result = group.get(kLogin).as(login);
    if (result.ok()) result = group.get(kPassword).as(password);
    if (result.ok()) result = info->setLoginConfig(login, password);

    String user, sessionId, sessionSecret;
    uError const userRead = group.get(kSessionUser).as(user);
    result = userRead;
    if (userRead.ok()) {
        result = group.get(kSessionId).as(sessionId);
        if (result.ok()) result = group.get(kSessionSecret).as(sessionSecret);
        if (result.ok()) {
            result = info->setSessionConfig(sessionId, sessionSecret, user, false, false);
        } else {
            // In memory only: nothing is sent, so nothing can fail.
            info->invalidateSessionConfigWithoutUser(false).ignore();
            result = info->setUserConfig(user, false, false);
        }
    }
    if (userRead.failed() || result.failed()) result = info->invalidateSessionConfigWithUser(false);

    Vector<String> wipe;
    result = group.get(kWipeComponents, wipe, Vector<String>());
    if (result.ok()) result = info->setWipeComponents(wipe);

    Vector<String> wakeup;
    result = group.get(kWakeupComponents, wakeup, Vector<String>());
    if (result.ok()) result = info->setWakeupComponents(wakeup);

    // The settings object is published whole, so no other thread sees it half filled.
    StdMutexLock lock(mutex_);
    connectionInfo_ = info;
    bool extended = haveExtendedApi_;
    result = group.get(kHaveExtendedApi, extended, true);
    haveExtendedApi_ = extended;
    useConfiguredSession_ = !extended;
    return result;
}

uError FacebookSource::startupImpl() {
    SmartPtr<FacebookLibrary::ConnectionInfo> info = connectionInfoRef();
    if (!info) return TRELM_ERROR_MSG(kNotSet, "source started before it was configured");
    auto library = makeSmart<FacebookLibrary>();
    TRELM_RETURN_IF_ERROR(library->setup(info));
    auto cache = makeSmart<MappingCache>();
    TRELM_RETURN_IF_ERROR(cache->setup());
    // Cursors opened before keep the previous client and cache.
    StdMutexLock lock(mutex_);
    library_ = std::move(library);
    mappingCache_ = std::move(cache);
    return TRELM_OK();
}

uError FacebookSource::shutdownImpl() { return TRELM_OK(); }

uError FacebookSource::preMessageImpl(IMessage& msg) {
    if (msg.type() != IServiceSource::GetUserSidMessage::kType) return TRELM_OK();
    auto* request = dynamic_cast<IServiceSource::GetUserSidMessage*>(&msg);
    if (request == nullptr) return TRELM_ERROR_MSG(kInvalid, "message of another class");
    SmartPtr<FacebookLibrary> library;
    SmartPtr<MappingCache> cache;
    startedRefs(library, cache);
    // Once started, the settings are the client's and are read under its mutex.
    if (library) return library->getUserId(request->result);
    SmartPtr<FacebookLibrary::ConnectionInfo> info = connectionInfoRef();
    if (!info) return TRELM_ERROR_MSG(kNotSet, "user id asked before the source was configured");
    return info->getUserId(request->result);
}

// ---- Configuration changes ----

uError FacebookSource::configurationChangedImpl(ConfigurationChangedMessage& msg) {
    SmartPtr<FacebookLibrary::ConnectionInfo> info;
    SmartPtr<FacebookLibrary> library;
    bool useConfiguredSession = false;
    bool haveExtendedApi = true;
    {
        StdMutexLock lock(mutex_);
        info = connectionInfo_;
        library = library_;
        useConfiguredSession = useConfiguredSession_;
        haveExtendedApi = haveExtendedApi_;
    }
    if (useConfiguredSession) {
        TRELM_RETURN_IF_ERROR(applySessionChange(msg, library));
    }
    if (!haveExtendedApi) return TRELM_OK();
    return applyLoginChange(msg, info, library);
}

uError FacebookSource::applySessionChange(ConfigurationChangedMessage const& msg,
                                          SmartPtr<FacebookLibrary> const& library) {
    if (!anyChanged(msg, {kSessionId, kSessionSecret, kSessionUser})) return TRELM_OK();
    if (!library) return TRELM_ERROR_MSG(kNotSet, "session change before the source was started");
    Map<String, Variant> values;
    uError err = readRuntimeConfiguration(name(), {kSessionId, kSessionSecret, kSessionUser}, values);
    if (err.failed()) return err;
    Watched const id = readWatched(values, kSessionId);
    Watched const secret = readWatched(values, kSessionSecret);
    Watched const user = readWatched(values, kSessionUser);
    // Only a complete answer is acted on; a partial one may be a store caught mid-update.
    if (id.state != Watched::Given || secret.state != Watched::Given || user.state != Watched::Given) {
        return TRELM_OK();
    }
    if (!id.value.empty() && !secret.value.empty() && !user.value.empty()) {
        err = library->applySession(id.value, secret.value, user.value);
        if (err.failed()) traceError("applying the configured session", err);
    } else {
        err = library->resetAccount(false);
        if (err.failed()) traceError("resetting the account", err);
    }
    return TRELM_OK();
}

uError FacebookSource::applyLoginChange(ConfigurationChangedMessage const& msg,
                                        SmartPtr<FacebookLibrary::ConnectionInfo> const& info,
                                        SmartPtr<FacebookLibrary> const& library) {
    if (!anyChanged(msg, {kAppKey, kAppSecret, kLogin, kPassword})) return TRELM_OK();
    if (!info) return TRELM_ERROR_MSG(kNotSet, "login change before the source was configured");
    Map<String, Variant> values;
    uError err = readRuntimeConfiguration(name(), {kAppKey, kAppSecret, kLogin, kPassword}, values);
    if (err.failed()) return err;

    Watched const appKeyGiven = readWatched(values, kAppKey);
    Watched const appSecretGiven = readWatched(values, kAppSecret);
    Watched const loginGiven = readWatched(values, kLogin);
    Watched const passwordGiven = readWatched(values, kPassword);

    // The new account settings are worked out and written in one step, under the client's mutex
    // once a client shares them: a cursor signing a request on another thread sees the old
    // account or the new one, never a mix. Nothing in this step sends a message.
    String login, password;
    bool loginChanged = false;
    uError readError, appError, loginError;
    auto change = [&](Info& settings) -> uError {
        String appKey, appSecret;
        if (completePair(settings, appKeyGiven, appSecretGiven, &Info::getAppKey, &Info::getAppSecret, appKey,
                         appSecret, readError)) {
            appError = settings.setAppConfig(appKey, appSecret);
        }
        if (completePair(settings, loginGiven, passwordGiven, &Info::getLogin, &Info::getPassword, login, password,
                         readError)) {
            loginError = settings.setLoginConfig(login, password);
            loginChanged = loginError.ok();
        }
        return TRELM_OK();
    };
    err = library ? library->withSettings(change) : change(*info);
    if (err.failed()) traceError("changing the account settings", err);
    if (readError.failed()) traceError("reading the current settings", readError);
    if (appError.failed()) traceError("changing the application settings", appError);
    if (loginError.failed()) traceError("changing the login", loginError);

    if (loginChanged) {
        if (!library) {
            traceError("signing in", TRELM_ERROR_MSG(kNotSet, "the source is not started"));
        } else if (login.empty() && password.empty()) {
            err = library->resetAccount(true);
            if (err.failed()) traceError("resetting the account", err);
        } else {
            err = library->connect();
            if (err.failed()) traceError("signing in", err);
        }
    }
    return TRELM_OK();
}

// ---- Data operations ----

uError FacebookSource::insertData(Record& record) {
    SmartPtr<FacebookLibrary> library;
    SmartPtr<MappingCache> cache;
    startedRefs(library, cache);
    if (!library) return TRELM_ERROR_MSG(kNotSet, "insert before the source was started");

    int type = 0;
    uError err = fieldRequired(record, "core_object_type", type);
    if (err.failed()) return err;

    if (type == kStatus) {
        String text;
        TRELM_RETURN_IF_ERROR(fieldRequiredNotEmpty(record, "core_event_text", text));
        return library->setStatus(text, true);
    }
    if (type != kMedia) return TRELM_ERROR_MSG(kInvalid, "only status posts and photos can be inserted");

    String uri;
    TRELM_RETURN_IF_ERROR(fieldRequiredNotEmpty(record, "media_uri", uri));
    // Absent optional fields simply stay empty: no caption, the default album.
    bool present = false;
    String caption;
    TRELM_RETURN_IF_ERROR(fieldOptional(record, "media_notes", present, caption));
    String albumId;
    TRELM_RETURN_IF_ERROR(fieldOptional(record, "facebook_media_album_service_id", present, albumId));
    auto stream = makeSmart<InputDataStream>();
    TRELM_RETURN_IF_ERROR(stream->setUri(uri));
    String photoId;
    TRELM_RETURN_IF_ERROR(library->sendPhoto(stream, albumId, caption, photoId));
    return record.insert("core_service_id", Variant(photoId));
}

uError FacebookSource::updateData(Record& /*record*/) { return TRELM_ERROR(kDataOpNotSupported); }

uError FacebookSource::removeData(GUID const& /*guid*/, bool /*flag*/) { return TRELM_ERROR(kDataOpNotSupported); }

uError FacebookSource::retrieveData(GUID const& guid, Record& record, bool flag) {
    if (flag) return TRELM_ERROR(kDataOpNotSupported);
    SmartPtr<FacebookLibrary> library;
    SmartPtr<MappingCache> cache;
    startedRefs(library, cache);
    if (!cache) return TRELM_ERROR_MSG(kNotSet, "retrieve before the source was started");
    SmartPtr<Map<String, Variant>> item;
    uError err = cache->getItem(guid, item);
    if (err.failed()) return err;
    if (!item) return TRELM_ERROR(kNotFound);
    // The stored record is shared with its cursor, which replaces records but never changes them,
    // so it can be read outside the cache's lock.
    for (auto const& [key, value] : *item) {
        TRELM_RETURN_IF_ERROR(record.insert(key, value));
    }
    return TRELM_OK();
}

uError FacebookSource::manageInputDataImpl(Record const& record, bool flag) {
    if (flag) return TRELM_ERROR(kDataOpNotSupported);
    int type = 0;
    TRELM_RETURN_IF_ERROR(fieldRequired(record, "core_object_type", type));
    if (type == kStatus) return fieldRequiredStringNotEmpty(record, "core_event_text");
    if (type == kMedia) return fieldRequiredStringNotEmpty(record, "media_uri");
    return TRELM_ERROR(kInvalid);
}

// ---- Queries ----

uError FacebookSource::selectObjectType(Vector<IQueryItems::Constraint> const& constraints, std::int64_t position,
                                        bool flag, String const& sourceName, int& type) {
    Set<int> candidates;
    for (CursorKind const& kind : kCursorKinds) {
        TRELM_RETURN_IF_ERROR(candidates.insert(kind.type));
    }

    for (IQueryItems::Constraint const& c : constraints) {
        String const& key = c.key.name();
        if (key == "core_object_type") {
            if (c.function == IQueryItems::Constraint::InList) {
                Vector<int> wanted;
                uError err = c.value.as(wanted);
                if (err.failed()) return TRELM_WRAP(kInvalid, err);
                Set<int> kept;
                for (int candidate : candidates) {
                    bool listed = false;
                    for (int w : wanted) listed = listed || w == candidate;
                    if (listed) TRELM_RETURN_IF_ERROR(kept.insert(candidate));
                }
                candidates = std::move(kept);
            } else if (c.function == IQueryItems::Constraint::Equal) {
                int wanted = 0;
                uError err = c.value.as(wanted);
                if (err.failed()) return TRELM_WRAP(kInvalid, err);
                // A type this source does not know leaves the candidates as they are.
                if (findKind(wanted) != nullptr) {
                    bool const had = candidates.contains(wanted);
                    candidates.clear();
                    if (had) TRELM_RETURN_IF_ERROR(candidates.insert(wanted));
                }
            } else {
                return TRELM_ERROR_MSG(kNotSupported, "unsupported comparison on core_object_type");
            }
        } else if (key == "core_object_source") {
            String source;
            uError err = c.value.as(source);
            if (err.failed()) return TRELM_WRAP(kInvalid, err);
            if (source != sourceName) return TRELM_ERROR_MSG(kNotSupported, "query for another source");
        }
    }

    if (candidates.empty()) return TRELM_ERROR_MSG(kNotSupported, "no object type of this source is asked for");
    if (position != -1) {
        bool usable = false;
        for (int candidate : candidates) usable = usable || findKind(candidate)->acceptsPosition;
        if (flag || !usable) return TRELM_ERROR_MSG(kInvalid, "a start position cannot be used for this query");
    }
    bool const streamPair = candidates.size() == 2 && candidates.contains(kStatus) && candidates.contains(kPhotoEvent);
    if (candidates.size() > 1 && !streamPair) {
        return TRELM_ERROR_MSG(kNotSupported, "a query must ask for one object type");
    }
    if (!flag) {
        for (int candidate : candidates) {
            if (findKind(candidate)->needsInteractive) return TRELM_ERROR(kNoData);
        }
    }
    for (CursorKind const& kind : kCursorKinds) {
        if (candidates.contains(kind.type)) {
            type = kind.type;
            return TRELM_OK();
        }
    }
    return TRELM_ERROR(kFailure);
}

uError FacebookSource::doStartQuery(IQueryItems::StartQueryMessage& msg, bool flag) {
    SmartPtr<FacebookLibrary> library;
    SmartPtr<MappingCache> cache;
    startedRefs(library, cache);
    if (!library || !cache) return TRELM_ERROR_MSG(kNotSet, "query before the source was started");

    Vector<IQueryItems::Constraint> const constraints = msg.constraints;
    int type = 0;
    uError err = selectObjectType(constraints, msg.position, flag, name(), type);
    if (err.code() != kSuccess) return err;
    CursorKind const* chosen = findKind(type);
    if (chosen == nullptr || chosen->make == nullptr) {
        return TRELM_ERROR_MSG(kNotSupported,
                               "queries for object type " + String::from(type) + " are not supported yet");
    }

    CursorArgs const args{library, cache, msg.columns, constraints, name(), msg.position};
    SmartPtr<CursorBase> cursor = chosen->make(args);
    err = cursor->start();
    if (err.failed()) {
        traceError("starting a cursor", err);
        return err;
    }
    msg.cursor = cursor;
    return TRELM_OK();
}

}  // namespace trelm
