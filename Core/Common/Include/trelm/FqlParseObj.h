#pragma once

#include "trelm/Export.h"
#include "trelm/ListHashParseObj.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// Reads the rows of an FQL answer:
//   <fql_query_response list="true"><user><uid>1</uid><name>..</name></user>...</fql_query_response>
// Each child of the root named `rowElement` is a row, read as by ListHashParseObj: leaf texts by
// name, nested elements as "parent.child", nil elements left out, empty elements "".
// Children of the root with another name are neither rows nor counted.
//
// Thread safety: one object per thread at a time (see XMLParser).
class TRELM_API FqlParseObj : protected ListHashParseObj {
public:
    // `root` is the answer's root element ("fql_query_response"); `rowElement` names the row
    // elements (the table: "user", "photo", ...; empty: every child of the root is a row); the
    // first `skip` rows are dropped.
    FqlParseObj(String root, String rowElement, unsigned skip);
    ~FqlParseObj() override;

    // Appends the rows after the first `skip` to `rows`; `count` receives the number of rows in
    // the whole answer (dropped ones included). Rows appended before a failure stay; `count` is
    // then the number of rows read. An empty answer is success with count 0. A root element with
    // another name (an "error_response") fails with kFailure.
    uError parse(String const& xml, Vector<Map<String, String>>& rows, unsigned& count);
};

}  // namespace trelm
