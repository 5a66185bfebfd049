#pragma once

#include "ServiceTransport.h"
#include "trelm/InputDataStream.h"
#include "trelm/Map.h"
#include "trelm/Mutex.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The data source's client of the Facebook REST service: every call is one form POST to
// "/restserver.php" on the service's own host, signed with MD5, answered in XML.
//
//   FacebookLibrary lib;
//   lib.setup(info);                 // once, with the account's ConnectionInfo
//   lib.connect();                   // log in with the stored e-mail and password
//   lib.runFqlQuery("SELECT ...", "user", rows, 0, count);
//
// Ordinary calls go to "http://api.facebook.com/restserver.php", the login call to the HTTPS
// twin. The client never changes these URLs; a host that wants them served elsewhere (the local
// emulator) says so in its "HttpRequestFactory" (connect-to table). Requests are obtained from the
// component "HttpRequestFactory"; the session is kept durable through "RuntimeConfiguration"
// (see ConnectionInfo). Both are reached with IMessage::send through the active registry.
//
// Results: every operation returns an uError; out-parameters are written only on success unless
// an operation says otherwise. Codes: kNotSet (no settings, missing application data),
// kNotSignedIn (no session, the service refused the session, or a failed sign-in), kRequestLimit
// (service code 4), kServiceUnavailable (service code 2), kServiceError (any other service code),
// kFailure (transport, HTTP status outside 200-299, an answer that can't be read).
//
// Secrets: the password travels only in the HTTPS login request; neither it nor the session secret
// appears in an error text or a trace line.
//
// Ownership and lifetime: the client shares its ConnectionInfo with the data source (SmartPtr);
// the source and each of its cursors hold the client by SmartPtr, so it lives as long as the last
// of them.
//
// Thread safety: after setup, the calls (runFqlQuery ... sendPhoto, runFacebookRequest) may run
// on several threads at once. The client mutex guards the call counter and every read or change
// of the shared ConnectionInfo once setup has handed it over, by this client or by anyone else
// (the data source changes settings through withSettings). It is held only while one request's
// authentication fields and signature are made, or while settings are read or changed in memory;
// never during an HTTP exchange or while a message is sent. So the call counter advances once per
// signed request, the "call_id" values of concurrent calls are distinct, and no request is signed
// with half-changed credentials. setup, connect, applySession and resetAccount are called by the
// data source one at a time.
class FacebookLibrary {
public:
    // The account: application credentials, login, session and user, and the components to notify
    // when the account changes. Defined in ConnectionInfo.h.
    class ConnectionInfo;

    // One inbox thread, as read from "mailbox.getInbox".
    struct ThreadObj {
        String threadId;     // "tid"
        String subject;      // "subject"
        int lastUpdate = 0;  // atoi of "last_update" (Unix time)
    };

    // One message of an inbox thread, as read from "mailbox.getThreadMessages".
    struct MessageObj {
        String messageId;            // "mid"
        String threadId;             // "tid"
        int timeSent = 0;            // atoi of "time_sent" (Unix time)
        String context;              // the caller's context text, the same for every message of a call
        String body;                 // "body"
        String author;               // the author's user id
        bool hasAttachment = false;  // see MessageParser for how it is decided
    };

    // Where requests go. Fixed; see the class comment.
    static constexpr char const* kServiceUrl = ServiceTransport::kServiceUrl;
    static constexpr char const* kLoginUrl = ServiceTransport::kLoginUrl;

    // An empty client without settings: every call fails until setup.
    FacebookLibrary();
    ~FacebookLibrary();
    FacebookLibrary(FacebookLibrary const&) = delete;
    FacebookLibrary& operator=(FacebookLibrary const&) = delete;

    // ---- Settings, login and session ----

    // Takes the account's settings (shared) and creates the client mutex. Once only.
    // kInvalid for an empty `info` or a second call (the first settings stay); kResource when the
    // mutex can't be made.
    uError setup(SmartPtr<ConnectionInfo> info);

    // The signed-in (or last known) user's id. kNotSet without settings; kNotSignedIn when no
    // user is known.
    uError getUserId(String& out);

    // Reads "facebook_source_lastuser" under `configTag` from "RuntimeConfiguration"; `oldUser`
    // is empty when the store has none. The send's failure is returned.
    uError getOldUserId(String const& configTag, String& oldUser);

    // Logs in with the stored e-mail and password (connectInternal). When another user than the
    // last one signs in, the wipe list is told to wipe and the wake-up list woken (sendWipes(true)).
    // Announces the outcome with one "ILoginStatus::LoginStatusMessage" to every component,
    // success or not. Returns connectInternal's result. kNotSet without settings (nothing sent).
    uError connect();

    // The login exchange: posts "facebook.auth.login" over HTTPS and stores the session it gets
    // (in memory and in the runtime-configuration store, with "facebook_source_lastuser").
    // kNotSignedIn wrapping the cause when no login is configured, and for rejected credentials
    // (service code 100); kFailure for an answer without "uid" or "session_key". A login answer
    // without "secret" makes later calls sign with the application secret.
    // The three out-parameters are written once the answer has been read, also when storing the
    // session then fails (the session is in memory all the same).
    uError connectInternal(String& sessionId, String& sessionSecret, String& userId);

    // Accepts a session obtained elsewhere: kept in memory only, while "facebook_source_lastuser"
    // is stored. Wipes and wake-ups as for connect; announces the outcome the same way.
    uError applySession(String const& sessionId, String const& sessionSecret, String const& userId);

    // Runs `use(ConnectionInfo&)` on the settings while holding the client mutex and returns its
    // result; kNotSet before setup, kResource when the mutex can't be taken. This is how anyone
    // but the client reads or changes the shared settings once cursors may be running. `use` must
    // not send messages, make requests or call into this client (the mutex is not recursive);
    // the setters it may call are the in-memory ones (store flags false).
    template <typename Use>
    uError withSettings(Use&& use) TRELM_EXCLUDES(mutex_) {
        if (!info_) return TRELM_ERROR(kNotSet);
        MutexLock guard(mutex_);
        if (!guard.locked()) return TRELM_ERROR(kResource);
        return use(*info_);
    }

    // Forgets the session and the user (`store`: also in the runtime-configuration store), tells
    // the wipe list to wipe, wakes nobody, and announces status kNotSignedIn with an empty user.
    // "facebook_source_lastuser" is kept, so the same user signing in again wipes nothing.
    // Failures on the way are traced, not returned: succeeds once settings exist (else kNotSet).
    uError resetAccount(bool store);

    // Sends one "WipeMessage" to each component of the wipe list, in order, then, if `alsoWakeup`,
    // one "WakeupMessage" to each component of the wake-up list. A failed send does not stop the
    // others (every component that holds the previous user's data must hear of the change); the
    // first failure is returned.
    uError sendWipes(bool alsoWakeup);

    // ---- Service calls (session calls: kNotSignedIn without a session) ----

    // "facebook.fql.query": appends the answer's `rowElement` rows to `rows` (the first
    // `parseArg` rows are dropped); `count` receives the number of rows in the answer.
    uError runFqlQuery(String const& query, String const& rowElement, Vector<Map<String, String>>& rows,
                       unsigned int parseArg, unsigned int& count);

    // "facebook.stream.get": appends one row per stream post; `count` = posts in the answer.
    uError runFStreamQuery(String const& viewerId, unsigned int startTime, unsigned int endTime, unsigned int limit,
                           Vector<Map<String, String>>& rows, unsigned int& count);

    // "mailbox.getInbox": appends the inbox threads from `start`, at most `limit`.
    uError getInboxThreads(int start, int limit, Vector<ThreadObj>& threads);

    // "mailbox.getThreadMessages": appends the messages of `threadId`; each record's context is
    // `context`.
    uError getThreadMessages(String const& threadId, String const& context, int start, int limit,
                             Vector<MessageObj>& messages);

    // "users.setStatus". kFailure when the service answers 0.
    uError setStatus(String const& status, bool includesVerb);

    // "photos.upload" of the file named by `photo` into `albumId` (empty: the application's
    // default album) with `caption` (empty: none). Once the answer has arrived, `photoId` is
    // emptied and receives the new photo's "pid".
    uError sendPhoto(SmartPtr<InputDataStream> photo, String const& albumId, String const& caption, String& photoId);

    // ---- Request building and transport (used by the calls above; public for tests and tools) ----
    // The request format, the signature, the exchange and the error codes are ServiceTransport's,
    // the one path this module's service clients share; the client adds its credentials, its
    // session and its call counter.

    // Inserts "method" and "v" = "1.0".
    uError makeBaseArgs(String const& method, Map<String, String>& args);

    // Adds "api_key", for a session call with a non-empty session id also "session_key" and
    // "call_id" (the next value of the client's counter: 1, 2, 3, ...), and "sig" last.
    // kNotSet without settings or application data; kNotSignedIn for a session call without a
    // session. Holds the client mutex throughout.
    uError addAuth(Map<String, String>& args, bool withSession) TRELM_EXCLUDES(mutex_);

    // One HTTP exchange: a request from "HttpRequestFactory", `args` as form fields, `data` (when
    // not empty) as the uploaded file of a multipart body. kFailure when no request can be had or
    // the status is outside 200-299; a failing step's own error otherwise.
    uError sendPost(String const& url, Map<String, String> const& args, SmartPtr<InputDataStream> data,
                    String& response);

    // sendPost to kServiceUrl, then turns an "error_response" document into its code (see
    // resolveBaseFacebookErrorCode). When the service refuses the session, the session is dropped
    // (in memory and in the store) and the user kept. `response` holds the answer on success.
    uError sendRequestAndCheckErrors(Map<String, String> const& args, SmartPtr<InputDataStream> data, String& response);

    // addAuth(args, true) then sendRequestAndCheckErrors. Every way of being unable to
    // authenticate comes back as kNotSignedIn. No retry, no automatic login.
    uError runFacebookRequest(Map<String, String>& args, SmartPtr<InputDataStream> data, String& response);

    // The service's error code (decimal text) to this system's code: 2 kServiceUnavailable,
    // 4 kRequestLimit, 102/400/401 kNotSignedIn, any other number kServiceError, not a number
    // kFailure. The result is always a failure.
    static uError resolveBaseFacebookErrorCode(String const& serviceCode);

private:
    // The MD5, as 32 lowercase hex digits, of every "key=value" of `args` in the map's order, run
    // together, followed by the secret: the session secret when a session is set and `args` holds
    // "session_key", else the application secret. kNotSet without application data.
    uError makeSignature(Map<String, String> const& args, String& sig) TRELM_REQUIRES(mutex_);

    // Drops the session in memory under the client mutex, then (store) resets it in the store.
    uError dropSession(bool withUser, bool store);
    // Announces a login status change to every component; a failed send is traced.
    void sendLoginStatus(String const& tag, unsigned status, String const& userId);

    // The client mutex, made by setup: guards callCounter_ and the settings info_ points to.
    Mutex mutex_;
    // The pointer is set once by setup and constant afterwards; what it points to is shared with
    // the data source and read or changed only under mutex_.
    SmartPtr<ConnectionInfo> info_ TRELM_PT_GUARDED_BY(mutex_);
    // The settings' configuration tag, copied by setup; constant afterwards.
    String configTag_;
    unsigned callCounter_ TRELM_GUARDED_BY(mutex_) = 0;
};

}  // namespace trelm

#include "ConnectionInfo.h"
