#include "ConnectionInfo.h"

#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"

namespace trelm {

FacebookLibrary::ConnectionInfo::ConnectionInfo(String const& configTag) : configTag_(configTag) {}

uError FacebookLibrary::ConnectionInfo::getConfigTag(String& out) const {
    out = configTag_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getAppKey(String& out) const {
    if (!appSet_) return TRELM_ERROR(kNotSet);
    out = appKey_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getAppSecret(String& out) const {
    if (!appSet_) return TRELM_ERROR(kNotSet);
    out = appSecret_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getLogin(String& out) const {
    if (!loginSet_) return TRELM_ERROR(kNotSet);
    out = login_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getPassword(String& out) const {
    if (!loginSet_) return TRELM_ERROR(kNotSet);
    out = password_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getSessionId(String& out) const {
    if (!sessionSet_) return TRELM_ERROR(kNotSignedIn);
    out = sessionId_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getSessionSecret(String& out) const {
    if (!sessionSet_) return TRELM_ERROR(kNotSignedIn);
    out = sessionSecret_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getUserId(String& out) const {
    if (!userSet_) return TRELM_ERROR(kNotSignedIn);
    out = userId_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::setAppConfig(String const& appKey, String const& appSecret) {
    bool const changed = appKey != appKey_ || appSecret != appSecret_;
    appKey_ = appKey;
    appSecret_ = appSecret;
    appSet_ = true;
    // Memory only: what happens to the stored session when an account is reconfigured is the
    // data source's decision.
    if (changed) return invalidateSessionConfigWithUser(false);
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::setLoginConfig(String const& login, String const& password) {
    login_ = login;
    password_ = password;
    loginSet_ = true;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::setSessionConfig(String const& sessionId, String const& sessionSecret,
                                                         String const& userId, bool storeSession, bool storeLastUser) {
    setSessionInMemory(sessionId, sessionSecret, userId);
    return ConnectionInfo::storeSession(configTag_, sessionId, sessionSecret, userId, storeSession, storeLastUser);
}

uError FacebookLibrary::ConnectionInfo::setUserConfig(String const& userId, bool storeUser, bool storeLastUser) {
    userId_ = userId;
    userSet_ = true;
    // A failed first store must not keep the last user from being stored: it is what tells a
    // change of person at the next sign-in.
    uError first = TRELM_OK();
    if (storeUser) first = sendStore(configTag_, {Configuration::Value(kSessionUserKey, userId)});
    if (storeLastUser) {
        uError err = sendStore(configTag_, {Configuration::Value(kLastUserKey, userId)});
        if (first.ok()) first = err;
    }
    return first;
}

uError FacebookLibrary::ConnectionInfo::invalidateSessionConfigWithUser(bool store) {
    dropSessionInMemory(true);
    return store ? storeSessionReset(configTag_, true) : TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::invalidateSessionConfigWithoutUser(bool store) {
    dropSessionInMemory(false);
    return store ? storeSessionReset(configTag_, false) : TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::setWakeupComponents(Vector<String> const& components) {
    wakeupComponents_ = components;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getWakeupComponents(Vector<String>& out) const {
    out = wakeupComponents_;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::setWipeComponents(Vector<String> const& components) {
    wipeComponents_ = components;
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::getWipeComponents(Vector<String>& out) const {
    out = wipeComponents_;
    return TRELM_OK();
}

void FacebookLibrary::ConnectionInfo::setSessionInMemory(String const& sessionId, String const& sessionSecret,
                                                         String const& userId) {
    sessionId_ = sessionId;
    sessionSecret_ = sessionSecret;
    userId_ = userId;
    sessionSet_ = true;
    userSet_ = true;
}

uError FacebookLibrary::ConnectionInfo::storeSession(String const& tag, String const& sessionId,
                                                     String const& sessionSecret, String const& userId,
                                                     bool storeSession, bool storeLastUser) {
    if (storeSession) {
        TRELM_RETURN_IF_ERROR(sendStore(tag, {Configuration::Value(kSessionIdKey, sessionId),
                                              Configuration::Value(kSessionSecretKey, sessionSecret),
                                              Configuration::Value(kSessionUserKey, userId)}));
    }
    if (storeLastUser) {
        TRELM_RETURN_IF_ERROR(sendStore(tag, {Configuration::Value(kLastUserKey, userId)}));
    }
    return TRELM_OK();
}

void FacebookLibrary::ConnectionInfo::dropSessionInMemory(bool withUser) {
    sessionId_ = String();
    sessionSecret_ = String();
    sessionSet_ = false;
    if (withUser) {
        userId_ = String();
        userSet_ = false;
    }
}

uError FacebookLibrary::ConnectionInfo::storeSessionReset(String const& tag, bool withUser) {
    // "facebook_source_lastuser" is never reset: it is how a change of user is told later.
    Set<String> keys{kSessionIdKey, kSessionSecretKey};
    if (withUser) {
        TRELM_RETURN_IF_ERROR(keys.insert(kSessionUserKey));
    }
    return sendReset(tag, std::move(keys));
}

uError FacebookLibrary::ConnectionInfo::sendStore(String const& tag, Set<Configuration::Value> values) {
    RuntimeConfigurationMessage msg(tag, std::move(values));
    uError err = msg.send(kStoreComponent);
    if (err.failed()) return TRELM_WRAP(kFailure, err);
    return TRELM_OK();
}

uError FacebookLibrary::ConnectionInfo::sendReset(String const& tag, Set<String> keys) {
    ResetRuntimeConfigurationMessage msg(tag, std::move(keys));
    uError err = msg.send(kStoreComponent);
    if (err.failed()) return TRELM_WRAP(kFailure, err);
    return TRELM_OK();
}

}  // namespace trelm
