#pragma once

#include "FqlCursorBase.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// Answers a query for contacts: the signed-in user's friends, or the users named by a
// "core_contact_service_id" constraint, as contact records ("core_object_type" 2). Pages through
// the FQL table "user" ordered by concat(uid,' '), with a keyset condition on the same expression.
//
// Constraints it understands:
//   "core_contact_service_id"  Equal (one id) or InList (ids): those users instead of the friends;
//                              each id must be a decimal number (kInvalid otherwise)
//   "core_contact_service", "core_object_origin_servicename", "core_object_type",
//   "core_object_source", "core_object_origin_importcomponent"
//                              checked here against the cursor's fixed values (Equal, NotEqual,
//                              InList); a query they rule out answers no rows without asking
// Any other constraint, or another function on these keys, is kNotSupported.
//
// Ownership and thread safety: as FqlCursorBase.
class ContactCursor : public FacebookSource::FqlCursorBase {
public:
    ContactCursor(SmartPtr<FacebookLibrary> library, SmartPtr<FacebookSource::MappingCache> cache,
                  Vector<IQueryItems::Column> const& columns, Vector<IQueryItems::Constraint> const& constraints,
                  String const& sourceId, bool flag, bool paged);
    ~ContactCursor() override;

    uError getSchema(Vector<IQueryItems::Column>& columns) override;

protected:
    uError derivedStart() override;
    uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                             String& query) override;
    uError getFieldList(String& fields) override;
    uError getObjectType(String& type) override;
    uError convertItem(Map<String, String> const& row, RecordPtr& record, int& convertError) override;
    uError getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) override;

private:
    // An answer field, the record key it is copied to, and that key's registered type.
    struct Field {
        String rowField;
        String recordKey;
        TRELM_TYPES::TYPES type;
    };

    // Set by derivedStart, constant afterwards.
    // Fills fields_ and prototype_.
    uError makePrototype();

    String baseCondition_;
    bool conditionGiven_ = false;  // baseCondition_ names the users; else the friends of the user
    // From a GreaterThan constraint on the service id: only the contacts after that id in the
    // cursor's order (a sync continuing where an earlier walk stopped); empty: from the first.
    String after_;
    // The keys every contact record carries with the same value ("core_contact_service",
    // "core_object_type" and the base fields): each record starts as a copy of this one.
    Record prototype_;
    Vector<Field> fields_;
};

}  // namespace trelm
