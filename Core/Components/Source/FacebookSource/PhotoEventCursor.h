#pragma once

#include "ContactNames.h"
#include "FqlCursorBase.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Answers a query for photo events: the photos in the albums of the user's friends, as records
// of "core_object_type" 5, newest first. Pages through the FQL table "photo" ordered by
// "created" with a keyset condition on (created, pid):
//
//   select pid,aid,owner,src,caption,created from photo where aid in (select aid from album
//   where owner in (select uid2 from friend where uid1='<user>')) [and (<time condition>)]
//   [and (created < T or (created = T and pid < 'P'))] order by created desc limit 150
//
// The service orders by "created" alone, so photos of one second may come in any order; the
// host reads this cursor through PhotoEventWrappedCursor, which sorts each such run.
// After each window the owners' names are looked up with one FQL statement (ContactNames).
//
// The query's ordering must begin as FStreamCursor::fixedOrdering() (kInvalid otherwise).
// Constraints it understands: "core_object_time" (< <= = >= > !=, the last given wins),
// "core_object_type" and "core_object_source" (checked by the dispatch). Any other is kInvalid.
//
// Ownership and thread safety: as FqlCursorBase.
class PhotoEventCursor : public FacebookSource::FqlCursorBase {
public:
    PhotoEventCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                     Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                     String const& sourceId, bool flag, bool paged);
    ~PhotoEventCursor() override;

    uError getSchema(Vector<IQueryItems::Column>& columns) override;

protected:
    uError derivedStart() override;
    uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                             String& query) override;
    uError getFieldList(String& fields) override;
    uError getObjectType(String& type) override;
    uError convertItem(Map<String, String> const& row, RecordPtr& record, int& convertError) override;
    uError getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) override;
    // Sets the owners' names ("core_event_contactname") on the window.
    uError postConvert(Vector<RecordPtr>& window) override;

private:
    String timeCondition_;  // set by derivedStart: "created >= 1262304000" or empty
    ContactNames contactNames_;
};

}  // namespace trelm
