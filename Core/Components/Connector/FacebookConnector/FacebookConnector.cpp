#include "FacebookConnector.h"

#include <cstdlib>
#include <utility>

namespace trelm {

String const facebookStatusFields("");
String const facebookPeerInfoFields("uid,first_name,last_name,name,profile_url");

namespace {

// A parameter or answer field, empty when absent.
String valueOf(Map<String, String> const& map, char const* key) {
    String const* value = map.search(key);
    return value ? *value : String();
}

NetworkMetadata::tRELMNetworkPeer peerOf(Map<String, String> const& info) {
    NetworkMetadata::tRELMNetworkPeer peer;
    peer.serviceId = valueOf(info, "uid");
    peer.firstName = valueOf(info, "first_name");
    peer.lastName = valueOf(info, "last_name");
    peer.fullName = valueOf(info, "name");
    peer.profileUrl = valueOf(info, "profile_url");
    return peer;
}

// A status the service does not show (or a peer who never set one) reads as empty text at time 0.
NetworkMetadata::tRELMNetworkEvent eventOf(Map<String, String> const& status) {
    NetworkMetadata::tRELMNetworkEvent event;
    event.statusText = valueOf(status, "status.message");
    event.statusTime = std::strtoll(valueOf(status, "status.time").cStr(), nullptr, 10);
    return event;
}

// The answer's records in the order of `ids`: `ordered[i]` is the record whose "uid" is ids[i].
// kFailure when the answer does not hold exactly one record per id.
uError inIdOrder(Vector<String> const& ids, Vector<Map<String, String>> const& answer,
                 Vector<Map<String, String> const*>& ordered) {
    if (answer.size() != ids.size()) {
        return TRELM_ERROR_MSG(kFailure, "asked for " + String::from(ids.size()) + " users, the service answered " +
                                             String::from(answer.size()));
    }
    Map<String, Map<String, String> const*> byUid;
    for (Map<String, String> const& record : answer) {
        TRELM_RETURN_IF_ERROR(byUid.insert(valueOf(record, "uid"), &record));
    }
    Vector<Map<String, String> const*> result;
    TRELM_RETURN_IF_ERROR(result.reserve(ids.size()));
    for (String const& id : ids) {
        Map<String, String> const* const* found = byUid.search(id);
        if (found == nullptr) return TRELM_ERROR_MSG(kFailure, "the service answered no user " + id);
        TRELM_RETURN_IF_ERROR(result.pushBack(*found));
    }
    ordered = std::move(result);
    return TRELM_OK();
}

}  // namespace

FacebookConnector::FacebookConnector(String name) : BaseConnector(std::move(name), id()) {}

FacebookConnector::~FacebookConnector() = default;

String FacebookConnector::id() { return String("@trelm.example:/facebookconnector"); }

FaceBook* FacebookConnector::client() const {
    StdMutexLock lock(mutex_);
    return client_.get();
}

int FacebookConnector::pollTime() const {
    StdMutexLock lock(mutex_);
    return pollTime_;
}

int FacebookConnector::maxTime() const {
    StdMutexLock lock(mutex_);
    return maxTime_;
}

uError FacebookConnector::sendConfigImpl(Configuration::Group const& group) {
    int pollTime = 0;
    int maxTime = 0;
    if (uError err = group.get("facebook_polltime").as(pollTime); err.failed()) {
        return TRELM_WRAP_MSG(kFailure, err, "facebook_polltime is not an integer");
    }
    if (uError err = group.get("facebook_maxtime").as(maxTime); err.failed()) {
        return TRELM_WRAP_MSG(kFailure, err, "facebook_maxtime is not an integer");
    }
    StdMutexLock lock(mutex_);
    pollTime_ = pollTime;
    maxTime_ = maxTime;
    return TRELM_OK();
}

uError FacebookConnector::makeConnection(Map<String, String>& params, bool /*flag*/) {
    FaceBook* facebook = nullptr;
    {
        StdMutexLock lock(mutex_);
        if (client_) return TRELM_OK();
        client_ = std::make_unique<FaceBook>(valueOf(params, "FacebookAppKey"), valueOf(params, "FacebookAppSecret"),
                                             valueOf(params, "FacebookID"));
        facebook = client_.get();
    }
    TRELM_RETURN_IF_ERROR(params.insert("FacebookID", facebook->userId()));
    uError err = facebook->connect(valueOf(params, "FacebookLogin"), valueOf(params, "FacebookPassword"));
    if (err.failed()) return TRELM_WRAP(err.code(), err);
    // The login names the user the client now acts for.
    return params.insert("FacebookID", facebook->userId());
}

uError FacebookConnector::closeConnection() { return TRELM_OK(); }

uError FacebookConnector::getPeers(Vector<String>& ids) {
    FaceBook* facebook = client();
    if (facebook == nullptr) return TRELM_OK();
    return facebook->getFriends(ids);
}

uError FacebookConnector::getPeerInfo(String uid, NetworkMetadata::tRELMNetworkPeer& peer) {
    FaceBook* facebook = client();
    if (facebook == nullptr) return TRELM_OK();
    Map<String, String> info;
    uError result = facebook->getUserInfo(uid, facebookPeerInfoFields, info);
    if (result.code() != kSuccess) return result;
    peer = peerOf(info);
    return TRELM_OK();
}

uError FacebookConnector::getPeerInfoBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkPeer>& peers) {
    FaceBook* facebook = client();
    if (facebook == nullptr) return TRELM_OK();
    Vector<Map<String, String>> answer;
    TRELM_RETURN_IF_ERROR(facebook->getUsersInfo(ids, facebookPeerInfoFields, answer));
    Map<String, Map<String, String> const*> byUid;
    for (Map<String, String> const& record : answer) {
        TRELM_RETURN_IF_ERROR(byUid.insert(valueOf(record, "uid"), &record));
    }
    Vector<NetworkMetadata::tRELMNetworkPeer> result;
    TRELM_RETURN_IF_ERROR(result.reserve(answer.size()));
    for (String const& id : ids) {
        if (Map<String, String> const* const* found = byUid.search(id)) {
            TRELM_RETURN_IF_ERROR(result.pushBack(peerOf(**found)));
        }
    }
    peers = std::move(result);
    return TRELM_OK();
}

uError FacebookConnector::getPeerStatus(String const& uid, NetworkMetadata::tRELMNetworkEvent& event) {
    Vector<String> ids{uid};
    Vector<NetworkMetadata::tRELMNetworkEvent> events;
    TRELM_RETURN_IF_ERROR(getPeerStatusBatch(ids, events));
    // Before a connection the batch answers nothing and the event stays as it was.
    if (!events.empty()) event = events[0];
    return TRELM_OK();
}

uError FacebookConnector::getPeerStatusBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkEvent>& events) {
    FaceBook* facebook = client();
    if (facebook == nullptr) return TRELM_OK();
    Vector<Map<String, String>> answer;
    if (uError err = facebook->getFriendsStatus(ids, answer); err.failed()) return TRELM_WRAP(kFailure, err);
    Vector<Map<String, String> const*> ordered;
    TRELM_RETURN_IF_ERROR(inIdOrder(ids, answer, ordered));
    Vector<NetworkMetadata::tRELMNetworkEvent> result;
    TRELM_RETURN_IF_ERROR(result.resize(ordered.size()));
    for (unsigned i = 0; i < ordered.size(); ++i) result[i] = eventOf(*ordered[i]);
    events = std::move(result);
    return TRELM_OK();
}

uError FacebookConnector::setStatus(String const& text) {
    FaceBook* facebook = client();
    if (facebook == nullptr) return TRELM_ERROR_MSG(kNotSignedIn, "no connection");
    return facebook->setStatus(text);
}

uError FacebookConnector::getPhotoAlbums(Vector<String>& /*albums*/) { return TRELM_OK(); }

uError FacebookConnector::publishPhoto(String const& /*uri*/, String const& /*caption*/) { return TRELM_OK(); }

uError FacebookConnector::publishPhotoTo(String const& /*albumId*/, String const& /*uri*/, String const& /*caption*/) {
    return TRELM_OK();
}

}  // namespace trelm
