#pragma once

#include "FqlCursorBase.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Answers a query for the friend requests the signed-in user has received and not answered
// ("core_object_type" 12). Pages through the FQL table "friend_request" (answer rows
// "friend_info") ordered by concat(uid_from, ' '), with a keyset condition on the requester's id.
//
// The query's columns must start with "core_event_service" and "core_event_serviceid" (strings,
// flag true); otherwise start fails with kInvalid. Constraints on "core_object_type" and
// "core_object_source" are accepted (the dispatch has checked them); any other is kInvalid.
//
// Records: "core_event_contactid" the requester's user id, "core_event_serviceid"
// "FriendRequest: " followed by it, "core_event_service" "Facebook", "core_object_type" 12,
// "core_object_time" the device's clock when the row was converted (a request carries no time of
// its own), "core_object_id" the GUID of the service id, and the fields every record carries.
//
// Ownership and thread safety: as FqlCursorBase.
class FriendRequestCursor : public FacebookSource::FqlCursorBase {
public:
    FriendRequestCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                        Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                        String const& sourceId, bool flag, bool paged);
    ~FriendRequestCursor() override;

    uError getSchema(Vector<IQueryItems::Column>& columns) override;

    // The requesters of the current window, in window order, gathered when it was converted.
    Vector<String> const& requesters() const noexcept { return requesters_; }

protected:
    uError derivedStart() override;
    uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                             String& query) override;
    uError getFieldList(String& fields) override;
    uError getObjectType(String& type) override;
    uError convertItem(Map<String, String> const& row, RecordPtr& record, int& convertError) override;
    uError getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) override;
    // Gathers the requesters' ids of the window.
    uError postConvert(Vector<RecordPtr>& window) override;

private:
    Vector<String> requesters_;
};

}  // namespace trelm
