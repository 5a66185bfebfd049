#pragma once

#include <memory>

#include "BaseConnector.h"
#include "FaceBook.h"
#include "trelm/Mutex.h"
#include "trelm/String.h"

namespace trelm {

// The plug-in's network connector: signs in to the service and reports the user's friends as
// peers with their profiles and status, and sets the user's own status. All service traffic goes
// through one FaceBook client, made by the first makeConnection.
//
//   Map<String, String> params{{"FacebookAppKey", key}, {"FacebookAppSecret", secret},
//                              {"FacebookLogin", email}, {"FacebookPassword", password}};
//   connector.makeConnection(params, false);   // params now holds "FacebookID"
//   connector.getPeers(ids);
//   connector.getPeerStatusBatch(ids, events);  // one request for all ids
//
// Connection parameters: "FacebookAppKey", "FacebookAppSecret" (the application),
// "FacebookLogin", "FacebookPassword" (the user's e-mail address and password), and
// "FacebookID": the service user id of the account. A host that knows it from an earlier
// connection may pass it in; makeConnection writes back the id the client acts for, which after
// a successful login is the signed-in user's.
//
// Configuration: "facebook_polltime" and "facebook_maxtime", both integers (seconds), both
// required. The poll time is how often the host should walk the connector to refresh the peers'
// status; the maximum time is the age beyond which the host should treat a peer's status as
// stale. The connector keeps both for the host (pollTime(), maxTime()) and schedules nothing
// itself: the host owns the walk.
//
// Before a connection, the peer and status queries succeed without data and leave their outputs
// untouched: the host sees an empty result rather than an error. setStatus then fails with
// kNotSignedIn, as a status cannot be set for nobody. Once made, the client stays for the life of
// the connector: a later makeConnection does nothing, also when the first login failed.
// closeConnection, getPhotoAlbums, publishPhoto and publishPhotoTo do nothing and succeed; the
// lifecycle hooks, walk, wake-up and the message hooks keep the base's behaviour (succeed).
//
// Lifetime: made by the plug-in's component factory and owned by the host; owns its client.
// Thread safety: every operation may be called from several threads. The connector mutex guards
// the client pointer and the configured times and is never held during an exchange with the
// service: the first makeConnection publishes its client before logging in, so a concurrent
// makeConnection is the no-op of a second call, and a query meanwhile finds a client not yet
// signed in (kNotSignedIn). The client does its own locking.
class FacebookConnector : public BaseConnector {
public:
    explicit FacebookConnector(String name);
    ~FacebookConnector() override;

    // The identifier under which the host's component table offers the connector. The table and
    // the connector itself both take it from here, so they cannot disagree.
    static String id();

    // `flag` is the host's "interactive" hint; the service's login needs no user interaction, so
    // it is not used. A connect failure is returned with its own code, wrapping the client's error.
    uError makeConnection(Map<String, String>& params, bool flag) override;
    uError closeConnection() override;
    // The friends' user ids.
    uError getPeers(Vector<String>& ids) override;
    // The fields facebookPeerInfoFields of `uid` into `peer`; the client's failure as it is.
    uError getPeerInfo(String uid, NetworkMetadata::tRELMNetworkPeer& peer) override;
    // The same for many ids in one request: `peers` becomes one record per id that the service
    // answered, in the order of `ids`.
    uError getPeerInfoBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkPeer>& peers) override;
    // The peer's status text and its time (0 when the peer has none). Any failure is kFailure
    // wrapping the cause; `event` is then left as it was.
    uError getPeerStatus(String const& uid, NetworkMetadata::tRELMNetworkEvent& event) override;
    // One request for all ids; `events[i]` is the status of `ids[i]`. kFailure wrapping the
    // client's failure, and kFailure when the service answers another number of statuses than
    // ids were asked for (or a status for an id not asked for); `events` is then left as it was.
    uError getPeerStatusBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkEvent>& events) override;
    // Sets the user's status to `text`.
    uError setStatus(String const& text) override;
    uError getPhotoAlbums(Vector<String>& albums) override;
    uError publishPhoto(String const& uri, String const& caption) override;
    uError publishPhotoTo(String const& albumId, String const& uri, String const& caption) override;

    // The configured times in seconds (0 until configured).
    int pollTime() const;
    int maxTime() const;

protected:
    uError sendConfigImpl(Configuration::Group const& group) override;

private:
    // The client, or null before the first makeConnection. A client once made lives as long as
    // the connector, so the pointer stays valid after the lock is released.
    FaceBook* client() const;

    // The connector mutex: guards the three below.
    mutable StdMutex mutex_;
    std::unique_ptr<FaceBook> client_ TRELM_GUARDED_BY(mutex_);
    int pollTime_ TRELM_GUARDED_BY(mutex_) = 0;
    int maxTime_ TRELM_GUARDED_BY(mutex_) = 0;
};

// The profile fields asked for a peer, and the status fields (none beyond the defaults). Set when
// the module is loaded, destroyed when it is unloaded.
extern String const facebookPeerInfoFields;
extern String const facebookStatusFields;

}  // namespace trelm
