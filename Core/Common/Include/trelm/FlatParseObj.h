#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/XMLParser.h"
#include "trelm/uError.h"

namespace trelm {

// Reads a document whose root element holds a single value, such as
//   <users_setStatus_response>1</users_setStatus_response>
// The value is the root's own text (text inside child elements is not part of it).
// A root element with another name fails with kFailure.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API FlatParseObj : public XMLParser {
public:
    explicit FlatParseObj(String root);
    ~FlatParseObj() override;

    // Sets `out` to the root's text. On failure `out` is left as it was.
    uError parse(String const& xml, String& out);

protected:
    uError start(String const& name, Vector<String> const& attributes) override;
    uError chars(String const& text) override;

private:
    // Constant after construction.
    String const root_;
    // State of one parse.
    String text_;
};

}  // namespace trelm
