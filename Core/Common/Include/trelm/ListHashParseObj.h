#pragma once

#include <string>
#include <string_view>

#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// Reads a list answer whose root repeats a record element, such as
//   <mailbox_getInbox_response list="true"><thread><tid>..</tid>..</thread>..</...>
// into one map per child of the root, field name to text, in document order.
//
// Fields of a record:
// - a leaf element gives its text under its name; an empty one gives "";
// - a nil element (xsi:nil="true") is left out, with everything inside it;
// - nested elements are named by their path below the record joined with ".":
//   <current_location><city>X</city></current_location> gives "current_location.city" = "X";
//   the structured element itself gives no field;
// - when a field name occurs twice in one record (a repeated nested list), the first is kept.
// A root element with another name fails with kFailure.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API ListHashParseObj : public XMLParser {
public:
    explicit ListHashParseObj(String root);
    ~ListHashParseObj() override;

    // Appends one map per child of the root to `rows`. Rows appended before a failure stay.
    uError parse(String const& xml, Vector<Map<String, String>>& rows);

protected:
    // Records are only the root's children named `rowElement` (every child when empty); the first
    // `skip` records are read but not appended.
    ListHashParseObj(String root, String rowElement, unsigned skip);
    // As parse(); `count` receives the number of records in the whole document (skipped ones
    // included), also on failure (the records read so far).
    uError parseRows(String const& xml, Vector<Map<String, String>>& rows, unsigned& count);

    uError startView(std::string_view name, char const* const* attributes) override;
    uError endView(std::string_view name) override;
    uError charsView(std::string_view text) override;

private:
    // Constant after construction.
    String const root_;
    String const rowElement_;
    unsigned const skip_;

    // State of one parse; rows_ is valid during parseRows() only.
    Vector<Map<String, String>>* rows_ = nullptr;
    unsigned count_ = 0;
    bool inRow_ = false;     // inside a record element
    unsigned nilDepth_ = 0;  // depth of an open nil element (0: none)
    // The names of the open elements inside the record element, each followed by ".": a leaf's
    // field name is this without its last ".".
    std::string fieldPath_;
    Map<String, String> row_;
    std::string text_;
    bool leafOpen_ = false;
};

}  // namespace trelm
