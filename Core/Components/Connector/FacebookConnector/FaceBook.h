#pragma once

#include "trelm/Map.h"
#include "trelm/Mutex.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The presence connector's own client of the Facebook REST service. It keeps its own
// credentials, session and call counter (apart from the data source's account), and sends its
// requests through ServiceTransport, the module's one signing and transport path: the same base
// fields, MD5 signature, "HttpRequestFactory" exchange and error codes as the data source's
// client.
//
//   FaceBook client(appKey, appSecret, String());
//   client.connect("me@example.org", password);          // "facebook.auth.login" over HTTPS
//   client.getFriends(ids);                              // "facebook.friends.get"
//   client.getFriendsStatus(ids, rows);                  // "facebook.users.getInfo", "uid,name,status"
//
// The third constructor argument is the service user id the client acts for, when the host
// already knows it from an earlier connection (empty otherwise). A login replaces it with the id
// the service answers; userId() gives the current one.
//
// Results: every call returns an uError; out-parameters are written only on success. Codes:
// kNotSignedIn (no session yet, rejected credentials, or the service refused the session, which
// the client then forgets while keeping the user id), kNotSet (no application key or secret),
// kNoData (getUserInfo: the service answered no such user), and ServiceTransport's codes.
//
// Secrets: the password travels only in the HTTPS login request and is not kept; neither it nor
// the session secret appears in an error text.
//
// Thread safety: every operation may run on several threads at once. The client mutex is held
// only while a request's authentication fields and signature are made (so each signed request
// gets its own "call_id") or while the session changes, never during an HTTP exchange.
class FaceBook {
public:
    // The friends' fields asked for by getFriendsStatus.
    static constexpr char const* kStatusFields = "uid,name,status";

    FaceBook(String appKey, String appSecret, String userId);
    ~FaceBook();
    FaceBook(FaceBook const&) = delete;
    FaceBook& operator=(FaceBook const&) = delete;

    // Logs in with e-mail and password ("facebook.auth.login", an application call over HTTPS)
    // and keeps the session it gets. A login answer without "secret" makes later calls sign with
    // the application secret. kNotSignedIn for rejected credentials; kFailure for an answer
    // without "uid" or "session_key".
    uError connect(String const& login, String const& password);

    // Takes a session obtained elsewhere (login by token); no request is made.
    void useSession(String const& sessionKey, String const& sessionSecret, String const& userId);

    bool connected() const;
    String userId() const;

    // "facebook.friends.get": the signed-in user's friends' ids, in the answer's order.
    uError getFriends(Vector<String>& uids);

    // "facebook.users.getInfo" for one id: `fields` (comma-separated) of user `uid`, as name to
    // text (nested values as "parent.child"). kNoData when the answer holds no user.
    uError getUserInfo(String const& uid, String const& fields, Map<String, String>& info);

    // "facebook.users.getInfo" for many ids in one request: one record per user the service
    // answered, in the answer's order. No ids: no request, an empty result.
    uError getUsersInfo(Vector<String> const& uids, String const& fields, Vector<Map<String, String>>& users);

    // The users' statuses: getUsersInfo with kStatusFields. Each record holds "uid", "name" and,
    // when the service shows one, "status.message", "status.time" and "status.status_id".
    uError getFriendsStatus(Vector<String> const& uids, Vector<Map<String, String>>& statuses);

    // "facebook.users.setStatus" with `text` (the text carries its own verb). kFailure when the
    // service answers 0.
    uError setStatus(String const& text);

private:
    // Signs `args` as a session call, posts it to the plain-HTTP endpoint and checks the answer
    // for an error document. A refused session is forgotten (the user id is kept).
    uError sessionCall(Map<String, String>& args, String& response);

    // Constant after construction.
    String const appKey_;
    String const appSecret_;

    // The client mutex: guards the four below.
    mutable StdMutex mutex_;
    String sessionKey_ TRELM_GUARDED_BY(mutex_);
    String sessionSecret_ TRELM_GUARDED_BY(mutex_);
    String userId_ TRELM_GUARDED_BY(mutex_);
    unsigned callCounter_ TRELM_GUARDED_BY(mutex_) = 0;
};

}  // namespace trelm
