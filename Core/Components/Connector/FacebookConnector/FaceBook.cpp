#include "FaceBook.h"

#include <cstdlib>
#include <utility>

#include "ServiceTransport.h"
#include "trelm/FlatParseObj.h"
#include "trelm/FqlParseObj.h"
#include "trelm/HashParseObj.h"
#include "trelm/ListParseObj.h"

namespace trelm {

FaceBook::FaceBook(String appKey, String appSecret, String userId)
    : appKey_(std::move(appKey)), appSecret_(std::move(appSecret)), userId_(std::move(userId)) {}

FaceBook::~FaceBook() = default;

uError FaceBook::connect(String const& login, String const& password) {
    if (appKey_.empty() || appSecret_.empty()) return TRELM_ERROR_MSG(kNotSet, "no application key or secret");
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(ServiceTransport::makeBaseArgs("facebook.auth.login", args));
    TRELM_RETURN_IF_ERROR(args.insert("email", login));
    TRELM_RETURN_IF_ERROR(args.insert("password", password));
    TRELM_RETURN_IF_ERROR(args.insert("api_key", appKey_));
    // The login is an application call: signed with the application secret, no session fields.
    TRELM_RETURN_IF_ERROR(args.insert("sig", ServiceTransport::signature(args, appSecret_)));
    String response;
    TRELM_RETURN_IF_ERROR(
        ServiceTransport::post(ServiceTransport::kLoginUrl, args, SmartPtr<InputDataStream>(), response));
    TRELM_RETURN_IF_ERROR(ServiceTransport::errorOf(response, true));

    Map<String, String> fields;
    if (uError err = HashParseObj("auth_login_response").parse(response, fields); err.failed()) {
        return TRELM_WRAP(kFailure, err);
    }
    String const* uid = fields.search("uid");
    String const* key = fields.search("session_key");
    if (uid == nullptr || key == nullptr) return TRELM_ERROR_MSG(kFailure, "login answer without uid or session_key");
    String const* secret = fields.search("secret");
    // A session without a secret of its own is signed with the application's.
    useSession(*key, secret ? *secret : appSecret_, *uid);
    return TRELM_OK();
}

void FaceBook::useSession(String const& sessionKey, String const& sessionSecret, String const& userId) {
    StdMutexLock lock(mutex_);
    sessionKey_ = sessionKey;
    sessionSecret_ = sessionSecret;
    userId_ = userId;
}

bool FaceBook::connected() const {
    StdMutexLock lock(mutex_);
    return !sessionKey_.empty();
}

String FaceBook::userId() const {
    StdMutexLock lock(mutex_);
    return userId_;
}

uError FaceBook::getFriends(Vector<String>& uids) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(ServiceTransport::makeBaseArgs("facebook.friends.get", args));
    String response;
    TRELM_RETURN_IF_ERROR(sessionCall(args, response));
    Vector<String> answer;
    TRELM_RETURN_IF_ERROR(ListParseObj("friends_get_response").parse(response, answer));
    uids = std::move(answer);
    return TRELM_OK();
}

uError FaceBook::getUserInfo(String const& uid, String const& fields, Map<String, String>& info) {
    Vector<Map<String, String>> users;
    TRELM_RETURN_IF_ERROR(getUsersInfo(Vector<String>{uid}, fields, users));
    if (users.empty()) return TRELM_ERROR_MSG(kNoData, "the service answered no user " + uid);
    info = users[0];
    return TRELM_OK();
}

uError FaceBook::getUsersInfo(Vector<String> const& uids, String const& fields, Vector<Map<String, String>>& users) {
    if (uids.empty()) {
        users = Vector<Map<String, String>>();
        return TRELM_OK();
    }
    String list;
    for (String const& uid : uids) {
        if (!list.empty()) list += ',';
        list += uid;
    }
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(ServiceTransport::makeBaseArgs("facebook.users.getInfo", args));
    TRELM_RETURN_IF_ERROR(args.insert("uids", list));
    TRELM_RETURN_IF_ERROR(args.insert("fields", fields));
    String response;
    TRELM_RETURN_IF_ERROR(sessionCall(args, response));
    Vector<Map<String, String>> answer;
    unsigned count = 0;
    TRELM_RETURN_IF_ERROR(FqlParseObj("users_getInfo_response", "user", 0).parse(response, answer, count));
    users = std::move(answer);
    return TRELM_OK();
}

uError FaceBook::getFriendsStatus(Vector<String> const& uids, Vector<Map<String, String>>& statuses) {
    return getUsersInfo(uids, kStatusFields, statuses);
}

uError FaceBook::setStatus(String const& text) {
    Map<String, String> args;
    TRELM_RETURN_IF_ERROR(ServiceTransport::makeBaseArgs("facebook.users.setStatus", args));
    TRELM_RETURN_IF_ERROR(args.insert("status", text));
    TRELM_RETURN_IF_ERROR(args.insert("status_includes_verb", "1"));
    String response;
    TRELM_RETURN_IF_ERROR(sessionCall(args, response));
    String value;
    TRELM_RETURN_IF_ERROR(FlatParseObj("users_setStatus_response").parse(response, value));
    if (std::atoi(value.cStr()) == 0) return TRELM_ERROR_MSG(kFailure, "the service did not set the status");
    return TRELM_OK();
}

uError FaceBook::sessionCall(Map<String, String>& args, String& response) {
    if (appKey_.empty() || appSecret_.empty()) return TRELM_ERROR_MSG(kNotSet, "no application key or secret");
    String sessionKey;
    {
        StdMutexLock lock(mutex_);
        if (sessionKey_.empty()) return TRELM_ERROR(kNotSignedIn);
        sessionKey = sessionKey_;
        TRELM_RETURN_IF_ERROR(args.insert("api_key", appKey_));
        TRELM_RETURN_IF_ERROR(args.insert("session_key", sessionKey_));
        ++callCounter_;
        TRELM_RETURN_IF_ERROR(args.insert("call_id", String::from(callCounter_)));
        TRELM_RETURN_IF_ERROR(args.insert("sig", ServiceTransport::signature(args, sessionSecret_)));
    }
    TRELM_RETURN_IF_ERROR(
        ServiceTransport::post(ServiceTransport::kServiceUrl, args, SmartPtr<InputDataStream>(), response));
    uError result = ServiceTransport::errorOf(response, false);
    if (result.code() == kNotSignedIn) {
        // The session that was refused is forgotten, unless a new one has replaced it meanwhile;
        // the user id stays, so the host can tell whether the same person comes back.
        StdMutexLock lock(mutex_);
        if (sessionKey_ == sessionKey) {
            sessionKey_ = String();
            sessionSecret_ = String();
        }
    }
    return result;
}

}  // namespace trelm
