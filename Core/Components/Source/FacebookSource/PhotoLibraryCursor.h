#pragma once

#include <cstdint>
#include <span>

#include "FqlCursorBase.h"
#include "trelm/Map.h"
#include "trelm/Metadata.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The common base of the album, media and photo-tag cursors: an FQL cursor over one table of the
// user's photo library, described by a Kind table that the derived cursor hands to the
// constructor (its FQL table and fields, the conversion of a row, its orderings and the
// conditions it understands).
//
// Ordering: the host's ordering columns are looked at in order; the first one the kind can order
// by decides the ordering and its sense (Column::flag true: ascending). Without such a column
// the kind's default ordering applies. Every ordering is one FQL expression that is unique per
// row (a time is followed by the row's id), so the keyset condition of a page ("expr > 'key'")
// never skips or repeats rows that share a time.
//
// Conditions: a constraint on an id key of the kind (Equal or InList) becomes "column in (...)"
// and replaces the default "rows of the signed-in user" condition; "core_object_time" with any
// comparison becomes a condition on the row's time; the keys every record carries with a fixed
// value ("core_object_type", "core_object_source", "core_object_origin_importcomponent",
// "core_object_origin_servicename") are decided here, and a query they rule out answers no rows
// without asking. Any other constraint, or another comparison on an id key, is kNotSupported;
// an id that is not a plain service id is kInvalid (ids go into the statement as literals).
//
// Since (unpaged) mode: constructed with `since` other than -1, the cursor asks once, without a
// row limit, for the rows changed at or after that time (seconds since the epoch; the kind says
// which time column counts) and keeps the whole answer in its window.
//
// Ownership and thread safety: as FqlCursorBase. The Kind table must outlive the cursor (the
// derived cursors pass static tables).
class PhotoLibraryCursor : public FacebookSource::FqlCursorBase {
public:
    // An answer field and the record key it is copied to (converted by the key's type).
    struct FieldMapping {
        char const* rowField;
        char const* recordKey;
    };

    // An ordering the host can ask for by naming `recordKey` among its columns. The ordering is
    // the FQL `expression`; the keyset value of a record is the text of its `parts` (record
    // keys) joined by blanks, which is what the expression yields for that record's row.
    struct Ordering {
        char const* recordKey;
        char const* expression;
        std::span<char const* const> parts;
    };

    // A constraint key that names rows by their ids: "column in (ids)". `numeric`: the ids are
    // decimal numbers (user ids), else service ids quoted as text.
    struct IdCondition {
        char const* recordKey;
        char const* column;
        bool numeric;
    };

    struct Kind {
        int objectType;                          // "core_object_type" of the records
        char const* table;                       // the FQL table
        char const* fields;                      // its field list
        std::span<FieldMapping const> fieldMap;  // answer fields to record keys
        char const* sidKey;                      // the cache key the identity is kept under
        std::span<char const* const> sidParts;   // record keys whose values, joined by blanks, are the identity
        std::span<Ordering const> orderings;     // [0] is the default
        bool defaultAscending;                   // sense of the default ordering
        std::span<IdCondition const> idConditions;
        char const* userColumn;   // default condition: "<userColumn> = <signed-in user>"
        char const* timeColumn;   // the column "core_object_time" stands for
        char const* sinceColumn;  // the column the since mode compares
    };

    static constexpr std::int64_t kNoSince = -1;

    PhotoLibraryCursor(Kind const& kind, SmartPtr<FacebookLibrary> library,
                       SmartPtr<FacebookSource::MappingCache> cache, Vector<IQueryItems::Column> const& columns,
                       Vector<IQueryItems::Constraint> const& constraints, String const& sourceId, bool flag,
                       std::int64_t since);
    ~PhotoLibraryCursor() override;

    // Every key the kind's records carry, with its registered type.
    uError getSchema(Vector<IQueryItems::Column>& columns) override;

    // The time the since mode started from, or kNoSince when the cursor pages.
    std::int64_t since() const noexcept { return since_; }

protected:
    uError derivedStart() override;
    uError generateBaseQuery(String const& fields, RecordPtr const& key, Direction direction, bool ordered,
                             String& query) override;
    uError getFieldList(String& fields) override;
    uError getObjectType(String& type) override;
    uError convertItem(Map<String, String> const& row, RecordPtr& record, int& convertError) override;
    uError getSid(RecordPtr const& record, Metadata::Key& key, String& serviceId) override;

    // Chooses the ordering from the host's columns.
    uError handleOrdering();
    // Turns one constraint into a condition of the statement (or a decision made here).
    // `canMatch` is cleared when the constraint rules out every row.
    uError handleItemCondition(IQueryItems::Constraint const& constraint, bool& canMatch);

private:
    struct Field {
        String rowField;
        String recordKey;
        TRELM_TYPES::TYPES type;
    };

    // The blank-joined values of `keys` in `record`; kInvalid when one is missing or could not
    // stand in an FQL literal.
    static uError joinedValues(RecordPtr const& record, std::span<char const* const> keys, String& out);
    uError makePrototype();

    // Constant after construction.
    Kind const& kind_;
    std::int64_t const since_;

    // Set by derivedStart, constant afterwards.
    Ordering const* ordering_ = nullptr;
    bool ascending_ = true;
    String idCondition_;    // the "in (...)" conditions, joined by " and "; empty: the user's rows
    String filter_;         // further conditions (times), each starting with " and "
    Record prototype_;      // the keys every record of the kind carries with the same value
    Vector<Field> fields_;  // fieldMap with the keys' types looked up once
};

}  // namespace trelm
