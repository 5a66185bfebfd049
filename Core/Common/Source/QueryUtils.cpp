#include "QueryUtils.h"

namespace trelm {

bool QueryUtils::isLess(Map<String, Variant> const& a, Map<String, Variant> const& b,
                        Vector<IQueryItems::Column> const& ordering) {
    for (auto const& column : ordering) {
        Variant const* va = a.search(column.key.name());
        Variant const* vb = b.search(column.key.name());
        // -1: a before b in ascending order, 1: after, 0: no difference in this column.
        int order = 0;
        if (va == nullptr || vb == nullptr) {
            order = (va == nullptr ? 0 : 1) - (vb == nullptr ? 0 : 1);
        } else if (*va < *vb) {
            order = -1;
        } else if (*vb < *va) {
            order = 1;
        }
        if (order != 0) return column.flag ? order < 0 : order > 0;
    }
    return false;
}

}  // namespace trelm
