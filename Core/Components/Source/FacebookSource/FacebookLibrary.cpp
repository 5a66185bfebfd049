#include "FacebookLibrary.h"

#include <cstdlib>

#include "ConnectionInfo.h"
#include "GetRuntimeConfigurationMessage.h"
#include "LoginStatusMessage.h"
#include "MessageParser.h"
#include "PhotoUploadParser.h"
#include "ServiceTransport.h"
#include "ThreadParser.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"
#include "trelm/FStreamParseObj.h"
#include "trelm/FlatParseObj.h"
#include "trelm/FqlParseObj.h"
#include "trelm/HashParseObj.h"
#include "trelm/Mutex.h"
#include "trelm/Trace.h"
#include "trelm/Variant.h"

namespace trelm {
namespace {

// Reports an error that the caller goes on without, one trace line per level of its chain. The
// chain holds codes and locations only (no request fields end up in error texts).
void note(char const* what, uError const& err) { traceError("FacebookLibrary", what, err); }

}  // namespace

FacebookLibrary::FacebookLibrary() = default;

FacebookLibrary::~FacebookLibrary() = default;

// ---- Settings, login and session ----

uError FacebookLibrary::setup(SmartPtr<ConnectionInfo> info) {
    if (!info) return TRELM_ERROR(kInvalid);
    if (info_) return TRELM_ERROR(kInvalid);
    if (mutex_.init() != 0) return TRELM_ERROR(kResource);
    info->getConfigTag(configTag_).ignore();  // always succeeds
    info_ = info;
    return TRELM_OK();
}

uError FacebookLibrary::getUserId(String& out) {
    if (!info_) return TRELM_ERROR(kNotSet);
    MutexLock guard(mutex_);
    if (!guard.locked()) return TRELM_ERROR(kResource);
    return info_->getUserId(out);
}

uError FacebookLibrary::getOldUserId(String const& configTag, String& oldUser) {
    Map<String, Variant> values;
    TRELM_RETURN_IF_ERROR(values.insert(ConnectionInfo::kLastUserKey, Variant()));
    GetRuntimeConfigurationMessage msg(configTag, values);
    uError err = msg.send(ConnectionInfo::kStoreComponent);
    if (err.failed()) return TRELM_WRAP(kFailure, err);
    String text;
    if (Variant const* value = values.search(ConnectionInfo::kLastUserKey); value && !value->empty()) {
        // A stored value that is not text is a broken store, not "no last user".
        if (uError err = value->as(text); err.failed()) return TRELM_WRAP(kFailure, err);
    }
    oldUser = text;
    return TRELM_OK();
}

uError FacebookLibrary::connect() {
    if (!info_) return TRELM_ERROR(kNotSet);
    String const tag = configTag_;
    String oldUser;
    if (uError err = getOldUserId(tag, oldUser); err.failed()) {
        // Without the last user nobody can tell a change of person: go on as on a first sign-in.
        note("reading the last user failed; no wipe will be sent", err);
        oldUser = String();
    }

    String sessionId;
    String sessionSecret;
    String userId;
    uError result = connectInternal(sessionId, sessionSecret, userId);
    if (result.ok() && !oldUser.empty() && oldUser != userId) {
        if (uError err = sendWipes(true); err.failed()) note("telling the components of the new user failed", err);
    }
    sendLoginStatus(tag, result.code(), userId);
    return result;
}

uError FacebookLibrary::connectInternal(String& sessionId, String& sessionSecret, String& userId) {
    if (!info_) return TRELM_ERROR(kNotSet);
    String login;
    String password;
    {
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        uError err = info_->getLogin(login);
        if (err.ok()) err = info_->getPassword(password);
        // Without a login there is no way to sign in; callers treat it like an expired session.
        if (err.failed()) return TRELM_WRAP(kNotSignedIn, err);
    }

    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("facebook.auth.login", args));
    TRELM_RETURN_IF_ERROR(args.insert("email", login));
    TRELM_RETURN_IF_ERROR(args.insert("password", password));
    TRELM_RETURN_IF_ERROR(addAuth(args, false));
    String response;
    TRELM_RETURN_IF_ERROR(sendPost(kLoginUrl, args, SmartPtr<InputDataStream>(), response));

    TRELM_RETURN_IF_ERROR(ServiceTransport::errorOf(response, true));

    Map<String, String> fields;
    if (uError err = HashParseObj("auth_login_response").parse(response, fields); err.failed()) {
        return TRELM_WRAP(kFailure, err);
    }
    String const* uid = fields.search("uid");
    if (uid == nullptr) return TRELM_ERROR(kFailure);
    String const* key = fields.search("session_key");
    if (key == nullptr) return TRELM_ERROR(kFailure);
    String secret;
    if (String const* given = fields.search("secret")) {
        secret = *given;
    } else {
        // A session without a secret of its own is signed with the application's.
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        TRELM_RETURN_IF_ERROR(info_->getAppSecret(secret));
    }

    userId = *uid;
    sessionId = *key;
    sessionSecret = secret;
    {
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        info_->setSessionInMemory(sessionId, sessionSecret, userId);
    }
    return ConnectionInfo::storeSession(configTag_, sessionId, sessionSecret, userId, true, true);
}

uError FacebookLibrary::applySession(String const& sessionId, String const& sessionSecret, String const& userId) {
    if (!info_) return TRELM_ERROR(kNotSet);
    String const tag = configTag_;
    String oldUser;
    if (uError err = getOldUserId(tag, oldUser); err.failed()) {
        note("reading the last user failed; no wipe will be sent", err);
        oldUser = String();
    }

    {
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        info_->setSessionInMemory(sessionId, sessionSecret, userId);
    }
    // The session came from elsewhere and stays in memory only; the last user is stored so that
    // a later sign-in can tell a change of person.
    uError result = ConnectionInfo::storeSession(configTag_, sessionId, sessionSecret, userId, false, true);
    if (result.ok() && !oldUser.empty() && oldUser != userId) {
        if (uError err = sendWipes(true); err.failed()) note("telling the components of the new user failed", err);
    }
    sendLoginStatus(tag, result.code(), userId);
    return result;
}

uError FacebookLibrary::resetAccount(bool store) {
    if (!info_) return TRELM_ERROR(kNotSet);
    String const tag = configTag_;
    if (uError err = dropSession(true, store); err.failed()) note("forgetting the stored session failed", err);
    if (uError err = sendWipes(false); err.failed()) note("telling the components to wipe failed", err);
    sendLoginStatus(tag, kNotSignedIn, String());
    return TRELM_OK();
}

uError FacebookLibrary::sendWipes(bool alsoWakeup) {
    if (!info_) return TRELM_ERROR(kNotSet);
    String const tag = configTag_;
    Vector<String> wipe;
    Vector<String> wakeup;
    {
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        // Copying the lists always succeeds.
        info_->getWipeComponents(wipe).ignore();
        if (alsoWakeup) info_->getWakeupComponents(wakeup).ignore();
    }
    Map<String, String> params;
    TRELM_RETURN_IF_ERROR(params.insert(tag, String()));

    // Every component keeps going on a failed send: each one that holds the previous user's data
    // must hear of the change even if another is missing.
    uError first = TRELM_OK();
    for (String const& component : wipe) {
        WipeMessage msg(params);
        uError err = msg.send(component);
        if (err.failed() && first.ok()) first = TRELM_WRAP_MSG(kFailure, err, "WipeMessage to " + component);
    }
    for (String const& component : wakeup) {
        WakeupMessage msg(params);
        uError err = msg.send(component);
        if (err.failed() && first.ok()) first = TRELM_WRAP_MSG(kFailure, err, "WakeupMessage to " + component);
    }
    return first;
}

void FacebookLibrary::sendLoginStatus(String const& tag, unsigned status, String const& userId) {
    ILoginStatus::LoginStatusMessage msg(tag, status, userId);
    if (uError err = msg.send(String()); err.failed()) note("announcing the login status failed", err);
}

uError FacebookLibrary::dropSession(bool withUser, bool store) {
    {
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        info_->dropSessionInMemory(withUser);
    }
    return store ? ConnectionInfo::storeSessionReset(configTag_, withUser) : TRELM_OK();
}

// ---- Service calls ----

uError FacebookLibrary::runFqlQuery(String const& query, String const& rowElement, Vector<Map<String, String>>& rows,
                                    unsigned int parseArg, unsigned int& count) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("facebook.fql.query", args));
    TRELM_RETURN_IF_ERROR(args.insert("query", query));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, SmartPtr<InputDataStream>(), response));
    FqlParseObj parser("fql_query_response", rowElement, parseArg);
    return parser.parse(response, rows, count);
}

uError FacebookLibrary::runFStreamQuery(String const& viewerId, unsigned int startTime, unsigned int endTime,
                                        unsigned int limit, Vector<Map<String, String>>& rows, unsigned int& count) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("facebook.stream.get", args));
    TRELM_RETURN_IF_ERROR(args.insert("viewer_id", viewerId));
    TRELM_RETURN_IF_ERROR(args.insert("start_time", String::from(startTime)));
    TRELM_RETURN_IF_ERROR(args.insert("end_time", String::from(endTime)));
    TRELM_RETURN_IF_ERROR(args.insert("limit", String::from(limit)));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, SmartPtr<InputDataStream>(), response));
    FStreamParseObj parser;
    return parser.parse(response, rows, count);
}

uError FacebookLibrary::getInboxThreads(int start, int limit, Vector<ThreadObj>& threads) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("mailbox.getInbox", args));
    TRELM_RETURN_IF_ERROR(args.insert("start", String::from(start)));
    TRELM_RETURN_IF_ERROR(args.insert("limit", String::from(limit)));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, SmartPtr<InputDataStream>(), response));
    ThreadParser parser(threads);
    return parser.parse(response);
}

uError FacebookLibrary::getThreadMessages(String const& threadId, String const& context, int start, int limit,
                                          Vector<MessageObj>& messages) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("mailbox.getThreadMessages", args));
    TRELM_RETURN_IF_ERROR(args.insert("tid", threadId));
    TRELM_RETURN_IF_ERROR(args.insert("start", String::from(start)));
    TRELM_RETURN_IF_ERROR(args.insert("limit", String::from(limit)));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, SmartPtr<InputDataStream>(), response));
    MessageParser parser(messages, context);
    return parser.parse(response);
}

uError FacebookLibrary::setStatus(String const& status, bool includesVerb) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("users.setStatus", args));
    TRELM_RETURN_IF_ERROR(args.insert("status", status));
    TRELM_RETURN_IF_ERROR(args.insert("status_includes_verb", includesVerb ? "1" : "0"));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, SmartPtr<InputDataStream>(), response));
    String value;
    TRELM_RETURN_IF_ERROR(FlatParseObj("users_setStatus_response").parse(response, value));
    if (std::atoi(value.cStr()) == 0) return TRELM_ERROR(kFailure);
    return TRELM_OK();
}

uError FacebookLibrary::sendPhoto(SmartPtr<InputDataStream> photo, String const& albumId, String const& caption,
                                  String& photoId) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(makeBaseArgs("photos.upload", args));
    if (!albumId.empty()) TRELM_RETURN_IF_ERROR(args.insert("aid", albumId));
    if (!caption.empty()) TRELM_RETURN_IF_ERROR(args.insert("caption", caption));
    String response;
    TRELM_RETURN_IF_ERROR(runFacebookRequest(args, photo, response));
    photoId = String();
    PhotoUploadParser parser(photoId);
    return parser.parse(response);
}

// ---- Request building and transport ----

uError FacebookLibrary::makeBaseArgs(String const& method, Map<String, String>& args) {
    return ServiceTransport::makeBaseArgs(method, args);
}

uError FacebookLibrary::addAuth(Map<String, String>& args, bool withSession) {
    if (!info_) return TRELM_ERROR(kNotSet);
    MutexLock guard(mutex_);
    if (!guard.locked()) return TRELM_ERROR(kResource);

    // The values are moved into the call: the getters' copies share the stored texts.
    static String const apiKeyField("api_key");
    static String const sessionKeyField("session_key");
    static String const callIdField("call_id");
    static String const sigField("sig");
    String appKey;
    TRELM_RETURN_IF_ERROR(info_->getAppKey(appKey));
    TRELM_RETURN_IF_ERROR(args.insert(apiKeyField, std::move(appKey)));
    if (withSession) {
        String sessionId;
        TRELM_RETURN_IF_ERROR(info_->getSessionId(sessionId));
        // An empty session id is no session: the request goes out as an application call.
        if (!sessionId.empty()) {
            TRELM_RETURN_IF_ERROR(args.insert(sessionKeyField, std::move(sessionId)));
            ++callCounter_;
            TRELM_RETURN_IF_ERROR(args.insert(callIdField, String::from(callCounter_)));
        }
    }
    String sig;
    TRELM_RETURN_IF_ERROR(makeSignature(args, sig));
    return args.insert(sigField, std::move(sig));
}

uError FacebookLibrary::makeSignature(Map<String, String> const& args, String& sig) {
    if (!info_) return TRELM_ERROR(kNotSet);
    String secret;
    static String const sessionKey("session_key");
    if (info_->hasSession() && args.contains(sessionKey)) {
        TRELM_RETURN_IF_ERROR(info_->getSessionSecret(secret));
    } else {
        TRELM_RETURN_IF_ERROR(info_->getAppSecret(secret));
    }
    sig = ServiceTransport::signature(args, secret);
    return TRELM_OK();
}

uError FacebookLibrary::sendPost(String const& url, Map<String, String> const& args, SmartPtr<InputDataStream> data,
                                 String& response) {
    return ServiceTransport::post(url, args, data, response);
}

uError FacebookLibrary::sendRequestAndCheckErrors(Map<String, String> const& args, SmartPtr<InputDataStream> data,
                                                  String& response) {
    TRELM_RETURN_IF_ERROR(sendPost(kServiceUrl, args, data, response));

    uError result = ServiceTransport::errorOf(response, false);
    if (result.code() == kNotSignedIn) {
        // The user is kept so that the next sign-in can tell whether the same person comes back.
        if (uError err = dropSession(false, true); err.failed()) note("forgetting the refused session failed", err);
    }
    return result;
}

uError FacebookLibrary::runFacebookRequest(Map<String, String>& args, SmartPtr<InputDataStream> data,
                                           String& response) {
    if (uError err = addAuth(args, true); err.failed()) {
        if (err.code() == kNotSet) return TRELM_WRAP(kNotSignedIn, err);
        return err;
    }
    return sendRequestAndCheckErrors(args, data, response);
}

uError FacebookLibrary::resolveBaseFacebookErrorCode(String const& serviceCode) {
    return ServiceTransport::resolveErrorCode(serviceCode);
}

}  // namespace trelm
