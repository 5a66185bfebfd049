#pragma once

#include "ComponentHost.h"
#include "HostConfig.h"
#include "LoginListener.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The host acting as the settings front end of one data source: it signs the source in the way
// a settings screen would. It puts the application and login keys of the component's
// configuration ("facebook_source_appkey", "facebook_source_appsecret",
// "facebook_source_login", "facebook_source_password") into "RuntimeConfiguration" under the
// component's name and sends the component a "ConfigurationChangedMessage" naming them; the
// source reads them back, logs in over HTTPS, keeps the session in the store and broadcasts
// "ILoginStatus::LoginStatusMessage", which the LoginListener records.
//
// The handed-over keys are held by the store in memory only (RuntimeConfiguration::hold) and
// released once the source has read them: the password and the application secret never reach
// the state folder, even when the host is killed during the sign-in, and the configuration file
// stays the one place for them. The session the source obtains is stored, so the next start
// reuses it, together with a fingerprint of the account it was made for (application key and
// login, "trelm_host_session_account"): a stored session of another account is never used.
//
// Lifetime: `host`, `listener` and `entry` must outlive the object.
// Thread safety: used by the host's controlling thread.
class SourceSignIn {
public:
    SourceSignIn(ComponentHost& host, LoginListener& listener, HostConfig::ComponentEntry const& entry);

    // True when the host can sign the component in: its configuration holds a non-empty
    // "facebook_source_login" and "haveExtendedApi" is true or absent (otherwise the session
    // comes from the configuration, not from a login).
    bool possible() const;

    // Whether the runtime store holds a session ("facebook_source_session_id") for the component
    // that was made for the configured account. A session of another account (or of an unknown
    // one) counts as none when the host can sign in (possible()).
    uError sessionStored(bool& stored) const;

    // Hands the keys over and asks the source to sign in. `status` receives the source's last
    // announcement for the component. Errors: the store's or the message's failure, wrapped;
    // kFailure when the source announced nothing; kFailure wrapping an error with the announced
    // code (and the source's traced explanation in its message) when the sign-in was refused.
    // REQUIRES: possible().
    uError signIn(LoginListener::Status& status);

private:
    ComponentHost& host_;
    LoginListener& listener_;
    HostConfig::ComponentEntry const& entry_;
};

}  // namespace host
}  // namespace trelm
