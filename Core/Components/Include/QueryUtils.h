#pragma once

#include "IQueryItems.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"

namespace trelm {

// Helpers for sources that order records themselves.
class TRELM_API QueryUtils {
public:
    // True when record a sorts before record b under `ordering`. The columns are taken in turn;
    // each compares the two records' values of its key by Variant::operator<, an absent value
    // counting as lower than any present one; the first column where they differ decides,
    // ascending when its flag is true and descending (the comparison reversed, absent values
    // then last) when false. Records equal under every column: false.
    static bool isLess(Map<String, Variant> const& a, Map<String, Variant> const& b,
                       Vector<IQueryItems::Column> const& ordering);
};

}  // namespace trelm
