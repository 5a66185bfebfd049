#pragma once

#include <cstdint>

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/Metadata.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace IQueryItems {

// One column of a cursor's schema or of a query's ordering. In an ordering, `flag` true means
// ascending and false descending.
struct Column {
    Metadata::Key key;
    bool flag = false;

    friend bool operator==(Column const& a, Column const& b) { return a.flag == b.flag && a.key == b.key; }
};

// One condition of a query: `key` compared by `function` with `value` (for InList, a list).
struct Constraint {
    enum Function {
        LessThan = 0,
        LessOrEqual = 1,
        Equal = 2,
        GreaterOrEqual = 3,
        GreaterThan = 4,
        NotEqual = 5,
        InList = 6,
    };

    Metadata::Key key;
    Variant value;
    Function function = Equal;
};

// The host's view of a query's result. Every operation returns an uError; a failure has the high
// bit set, kNoData means there is no row there.
// Lifetime: held by the host through SmartPtr<ICursor>.
// Thread safety: implementations say; the host may call from several threads.
class TRELM_API ICursor {
public:
    virtual ~ICursor();

    // The columns (metadata keys with their types) that this cursor's records carry.
    virtual uError getSchema(Vector<Column>& columns) = 0;
    // The record at the current position.
    virtual uError getRow(SmartPtr<Map<String, Variant>>& row) = 0;
    // Up to `count` records from the current position.
    virtual uError getRows(unsigned count, Vector<SmartPtr<Map<String, Variant>>>& rows) = 0;
    // Moves the position by delta (negative: backwards); `moved` is how far it really moved.
    virtual uError seek(int delta, int& moved) = 0;
    virtual uError jumpBeginning() = 0;
    virtual uError jumpEnd() = 0;
    virtual uError jump(unsigned index) = 0;
    virtual uError curRow(unsigned& index) = 0;
    virtual uError numRows(unsigned& count) = 0;
};

// Asks a source to open a cursor. The source fills `cursor` on success.
class TRELM_API StartQueryMessage : public IMessage {
public:
    static constexpr char const* kType = "IQueryItems::StartQueryMessage";

    StartQueryMessage() : IMessage(kType) {}
    StartQueryMessage(Vector<Column> columns, Vector<Constraint> constraints, std::int64_t position = -1)
        : IMessage(kType), columns(std::move(columns)), constraints(std::move(constraints)), position(position) {}
    ~StartQueryMessage() override;

    // The wanted columns; also the query's ordering.
    Vector<Column> columns;
    Vector<Constraint> constraints;
    // An absolute start position for sources that can use it; -1 when unset.
    std::int64_t position = -1;
    // Result: the opened cursor.
    SmartPtr<ICursor> cursor;
    // False for a query made in the background (no user waiting), true otherwise.
    bool interactive = true;
};

}  // namespace IQueryItems
}  // namespace trelm
