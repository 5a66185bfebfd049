#pragma once

#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// Reads a document whose root element holds named values, such as
//   <auth_login_response><session_key>..</session_key><uid>..</uid></auth_login_response>
// into a map of the root's children, element name to text.
//
// - A child with elements of its own gives "" (its structure is not read).
// - A nil child (xsi:nil="true") is left out; an empty child gives "".
// - A name that occurs twice keeps its later value.
// - A root element with another name fails with kFailure: HashParseObj("error_response") is how
//   a caller tells an error document from an answer.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API HashParseObj : public XMLParser {
public:
    explicit HashParseObj(String root);
    ~HashParseObj() override;

    // Inserts the root's children into `out` (replacing equal keys). On failure `out` is left as
    // it was. Malformed XML and a wrong root give kFailure.
    uError parse(String const& xml, Map<String, String>& out);

protected:
    uError start(String const& name, Vector<String> const& attributes) override;
    uError end(String const& name) override;
    uError chars(String const& text) override;

private:
    // Constant after construction.
    String const root_;
    // State of one parse.
    Map<String, String> values_;
    String text_;
    bool leafOpen_ = false;  // no element has started since the last start
    bool nil_ = false;       // the last started element is nil
};

}  // namespace trelm
