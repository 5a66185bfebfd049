#pragma once

#include "FacebookLibrary.h"
#include "trelm/Configuration.h"
#include "trelm/Set.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Everything the client needs to talk to the service for one configured account: the
// application's key and secret, the user's e-mail and password, the current session and its
// user, and the components to notify when the account changes.
//
// The session is kept durable in the host's "RuntimeConfiguration" component, under the
// configuration tag, with these keys:
//   "facebook_source_session_id", "facebook_source_session_secret", "facebook_source_session_user"
//   "facebook_source_lastuser"  the last user that signed in (never reset, so that a change of
//                               user can be told after a log-out)
// The messages are sent synchronously with IMessage::send; a setter changes memory first and then
// returns the first failed send (nothing is rolled back).
//
// Getters copy into their out-parameter only when the value is known, else leave it untouched and
// fail: kNotSet for missing application or login data (a configuration fault), kNotSignedIn for a
// missing session or user. Empty strings are legal values.
//
// Ownership: shared by SmartPtr between the data source and its FacebookLibrary.
// Thread safety: no lock of its own. Once FacebookLibrary::setup has taken an instance, it is
// guarded by that client's mutex: the client holds it while it signs a request or changes the
// session, and everyone else goes through FacebookLibrary::withSettings. Before that (while the
// data source fills a fresh instance from its configuration) one thread owns it.
class FacebookLibrary::ConnectionInfo {
public:
    static constexpr char const* kSessionIdKey = "facebook_source_session_id";
    static constexpr char const* kSessionSecretKey = "facebook_source_session_secret";
    static constexpr char const* kSessionUserKey = "facebook_source_session_user";
    static constexpr char const* kLastUserKey = "facebook_source_lastuser";
    // The component the session is stored in.
    static constexpr char const* kStoreComponent = "RuntimeConfiguration";

    explicit ConnectionInfo(String const& configTag);

    // The configuration tag given at construction. Always succeeds.
    uError getConfigTag(String& out) const;

    uError getAppKey(String& out) const;         // kNotSet before setAppConfig
    uError getAppSecret(String& out) const;      // kNotSet before setAppConfig
    uError getLogin(String& out) const;          // kNotSet before setLoginConfig
    uError getPassword(String& out) const;       // kNotSet before setLoginConfig
    uError getSessionId(String& out) const;      // kNotSignedIn without a session
    uError getSessionSecret(String& out) const;  // kNotSignedIn without a session
    uError getUserId(String& out) const;         // kNotSignedIn without a user

    // Stores the application's key and secret. When either differs from the stored one, the
    // session and user are dropped in memory (a session of another application is worthless);
    // nothing is sent.
    uError setAppConfig(String const& appKey, String const& appSecret);

    // Stores e-mail and password. Leaves the session alone.
    uError setLoginConfig(String const& login, String const& password);

    // Stores session and user in memory; then, if `storeSession`, sends the three session keys;
    // if `storeLastUser` (and the first send did not fail), sends "facebook_source_lastuser".
    uError setSessionConfig(String const& sessionId, String const& sessionSecret, String const& userId,
                            bool storeSession, bool storeLastUser);

    // Stores the user in memory (the session is left as it is); then, if `storeUser`, sends
    // "facebook_source_session_user"; if `storeLastUser`, sends "facebook_source_lastuser". Both
    // are sent even when the first fails; the first failure is returned.
    uError setUserConfig(String const& userId, bool storeUser, bool storeLastUser);

    // Drops session and user in memory; if `store`, resets the three session keys in the store.
    uError invalidateSessionConfigWithUser(bool store);

    // Drops the session in memory, keeping the user; if `store`, resets
    // "facebook_source_session_id" and "facebook_source_session_secret" in the store.
    uError invalidateSessionConfigWithoutUser(bool store);

    uError setWakeupComponents(Vector<String> const& components);
    uError getWakeupComponents(Vector<String>& out) const;
    uError setWipeComponents(Vector<String> const& components);
    uError getWipeComponents(Vector<String>& out) const;

    // True while a session is known (an empty session id counts).
    bool hasSession() const noexcept { return sessionSet_; }

private:
    // FacebookLibrary changes the session in memory under its client mutex and sends the store
    // messages after releasing it, so it uses the two halves of the setters separately. The
    // sending halves are static: they need only the tag, never the guarded fields.
    friend class FacebookLibrary;

    void setSessionInMemory(String const& sessionId, String const& sessionSecret, String const& userId);
    static uError storeSession(String const& tag, String const& sessionId, String const& sessionSecret,
                               String const& userId, bool storeSession, bool storeLastUser);
    void dropSessionInMemory(bool withUser);
    static uError storeSessionReset(String const& tag, bool withUser);

    // One "RuntimeConfigurationMessage" / "ResetRuntimeConfigurationMessage" under `tag`.
    static uError sendStore(String const& tag, Set<Configuration::Value> values);
    static uError sendReset(String const& tag, Set<String> keys);

    // Constant after construction.
    String const configTag_;

    // Guarded by the client mutex once a FacebookLibrary has the instance; see the class comment.
    bool appSet_ = false;
    bool loginSet_ = false;
    bool userSet_ = false;
    bool sessionSet_ = false;
    String appSecret_;
    String appKey_;
    String login_;
    String password_;
    String sessionId_;
    String sessionSecret_;
    String userId_;
    Vector<String> wakeupComponents_{16};
    Vector<String> wipeComponents_{16};
};

}  // namespace trelm
