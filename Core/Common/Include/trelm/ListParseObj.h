#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// Reads a list answer whose root repeats one value element, such as
//   <friends_get_response list="true"><uid>1002</uid><uid>1003</uid></friends_get_response>
// into the texts of the root's children, in document order.
//
// - A nil child is left out; an empty child gives ""; a child with elements gives "".
// - A root element with another name fails with kFailure.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API ListParseObj : public XMLParser {
public:
    explicit ListParseObj(String root);
    ~ListParseObj() override;

    // Appends one text per child of the root to `out`. Texts appended before a failure stay.
    uError parse(String const& xml, Vector<String>& out);

protected:
    uError start(String const& name, Vector<String> const& attributes) override;
    uError end(String const& name) override;
    uError chars(String const& text) override;

private:
    // Constant after construction.
    String const root_;
    // State of one parse; out_ is valid during parse() only.
    Vector<String>* out_ = nullptr;
    String text_;
    bool leafOpen_ = false;
    bool nil_ = false;
};

}  // namespace trelm
