#include "FqlCursorBase.h"

#include <algorithm>
#include <climits>
#include <new>
#include <utility>

#include "MappingCache.h"
#include "trelm/GUID.h"

namespace trelm {

FacebookSource::FqlCursorBase::FqlCursorBase(SmartPtr<FacebookLibrary> library, SmartPtr<MappingCache> cache,
                                             Vector<IQueryItems::Column> const& columns,
                                             Vector<IQueryItems::Constraint> const& constraints, String const& sourceId,
                                             bool flag, bool paged)
    : CursorBase(std::move(library), std::move(cache), columns, constraints, sourceId, flag), paged_(paged) {}

FacebookSource::FqlCursorBase::~FqlCursorBase() = default;

uError FacebookSource::FqlCursorBase::getRow(RecordPtr& row) {
    TRELM_RETURN_IF_ERROR(ensureLoaded());
    if (position_ >= window_.size()) {
        if (window_.empty()) {
            row.reset();
            return TRELM_ERROR(kNoData);
        }
        return TRELM_ERROR(kOutOfWindow);
    }
    // The host gets its own copy: the window's record is shared with the mapping cache and is
    // replaced, not changed, by later refills. Copying the whole map at once copies its tree as
    // it is, without a key search per entry.
    RecordPtr copy;
    try {
        copy = makeSmart<Record>(*window_[position_]);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    row = std::move(copy);
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::getRows(unsigned /*count*/, Vector<RecordPtr>& /*rows*/) {
    return TRELM_ERROR(kNotSupported);
}

uError FacebookSource::FqlCursorBase::seek(int delta, int& moved) {
    uError err = ensureLoaded();
    if (err.failed()) return err;
    atBeginning_ = false;
    if (!paged_) return seekUnpaged(delta, moved);

    long long const n = window_.size();
    long long const p = position_;
    long long const w = windowSize_;
    unsigned got = 0;
    int convertError = -1;

    if (delta < 0) {
        long long const back = -static_cast<long long>(delta);
        if (back <= p) {
            position_ = static_cast<unsigned>(p - back);
            moved = delta;
            return TRELM_OK();
        }
        if (n == 0) {
            position_ = 0;
            moved = 0;
            return TRELM_OK();
        }
        RecordPtr const key = window_[0];
        err = refreshWindow(key, static_cast<unsigned>(back - p - 1), windowSize_, false, got, convertError);
        if (err.failed()) return err;
        long long const n2 = window_.size();
        if (err.code() != kNoData) {
            // The wanted row is the last of the new window, which ends just before the old key.
            position_ = static_cast<unsigned>(n2 - 1);
            moved = delta;
            backwardWindow_ = n2 < w;
        } else {
            // Fewer rows before the key than asked: the window now starts at the first row.
            position_ = 0;
            moved = static_cast<int>(-(p + got));
            backwardWindow_ = true;
        }
        return err;
    }

    if (p + delta < n) {
        position_ = static_cast<unsigned>(p + delta);
        moved = delta;
        return TRELM_OK();
    }
    if (n == 0 || (n < w && !backwardWindow_)) {
        // The window already ends at the end of the result.
        moved = n == 0 ? 0 : static_cast<int>(n - p - 1);
        position_ = n == 0 ? 0 : static_cast<unsigned>(n - 1);
        return TRELM_OK();
    }
    RecordPtr const key = window_[static_cast<unsigned>(n - 1)];
    err = refreshWindow(key, static_cast<unsigned>(p + delta - n), windowSize_, true, got, convertError);
    if (err.failed()) return err;
    if (err.code() != kNoData) {
        position_ = 0;
        moved = delta;
    } else {
        // The result ends before the wanted row: stop on its last row.
        moved = static_cast<int>((n - p - 1) + got);
        position_ = window_.empty() ? 0 : window_.size() - 1;
    }
    backwardWindow_ = false;
    return err;
}

uError FacebookSource::FqlCursorBase::seekUnpaged(int delta, int& moved) {
    long long const n = window_.size();
    long long const p = position_;
    if (delta < 0 && -static_cast<long long>(delta) > p) {
        moved = static_cast<int>(-p);
        position_ = 0;
    } else if (delta == 0) {
        moved = 0;
    } else if (delta > 0 && p + delta >= n) {
        moved = n == 0 ? 0 : static_cast<int>(n - p - 1);
        position_ = n == 0 ? 0 : static_cast<unsigned>(n - 1);
    } else {
        position_ = static_cast<unsigned>(p + delta);
        moved = delta;
    }
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::jumpBeginning() {
    if (atBeginning_ && windowLoaded_) return TRELM_OK();
    if (!paged_ && windowLoaded_) {
        // The window holds the whole result: nothing to ask.
        atBeginning_ = true;
        position_ = 0;
        return TRELM_OK();
    }
    bool const wasAtBeginning = atBeginning_;
    atBeginning_ = true;
    unsigned got = 0;
    int convertError = -1;
    uError err = refreshWindow(RecordPtr(), 0, windowSize_, true, got, convertError);
    if (err.failed()) {
        atBeginning_ = wasAtBeginning;
        return err;
    }
    position_ = 0;
    backwardWindow_ = false;
    return err;
}

uError FacebookSource::FqlCursorBase::jumpEnd() {
    atBeginning_ = false;
    if (!paged_ && windowLoaded_) {
        position_ = window_.empty() ? 0 : window_.size() - 1;
        return window_.empty() ? TRELM_ERROR(kNoData) : TRELM_OK();
    }
    unsigned got = 0;
    int convertError = -1;
    uError err = refreshWindow(RecordPtr(), 0, windowSize_, false, got, convertError);
    if (err.failed()) return err;
    position_ = window_.empty() ? 0 : window_.size() - 1;
    backwardWindow_ = false;
    return err;
}

uError FacebookSource::FqlCursorBase::jump(unsigned index) {
    uError err = jumpBeginning();
    if (index != 0) atBeginning_ = false;
    if (err.failed() || index == 0) return err;
    int moved = 0;
    return seek(static_cast<int>(std::min<unsigned>(index, INT_MAX)), moved);
}

uError FacebookSource::FqlCursorBase::curRow(unsigned& index) {
    TRELM_RETURN_IF_ERROR(ensureLoaded());
    if (position_ >= window_.size()) return TRELM_ERROR(kNoData);
    // The window's own index is the answer when the window is known to start at the first row.
    if (!paged_ || atBeginning_) {
        index = position_;
        return TRELM_OK();
    }
    unsigned total = 0;
    TRELM_RETURN_IF_ERROR(countRows(window_[position_], kUpTo, total));
    if (total == 0) return TRELM_ERROR_MSG(kNoData, "the current record is no longer in the result");
    index = total - 1;
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::numRows(unsigned& count) {
    if (rowCountKnown_) {
        count = rowCount_;
        return TRELM_OK();
    }
    unsigned total = 0;
    TRELM_RETURN_IF_ERROR(countRows(RecordPtr(), kAfter, total));
    rowCount_ = total;
    rowCountKnown_ = true;
    count = total;
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::countRows(RecordPtr const& key, Direction direction, unsigned& total) {
    String query;
    uError made = generateBaseQuery("''", key, direction, false, query);
    TRELM_RETURN_IF_ERROR(made);
    // A cursor filled by other calls than FQL (the stream cursor) has no statement to count with.
    if (made.code() == kNoData) return TRELM_ERROR_MSG(kNotSupported, "this cursor cannot count its rows");
    String type;
    TRELM_RETURN_IF_ERROR(getObjectType(type));
    Vector<Map<String, String>> rows;
    total = 0;
    return library_->runFqlQuery(query, type, rows, 0, total);
}

uError FacebookSource::FqlCursorBase::refreshWindow(RecordPtr const& key, unsigned offset, unsigned count, bool forward,
                                                    unsigned& got, int& convertError) {
    convertError = -1;
    if (noMoreData_) {
        got = 0;
        return TRELM_ERROR(kNoData);
    }
    String fields;
    uError err = getFieldList(fields);
    if (err.failed()) return err;
    String query;
    if (!paged_) {
        TRELM_RETURN_IF_ERROR(generateBaseQuery(fields, RecordPtr(), kAfter, true, query));
    } else {
        TRELM_RETURN_IF_ERROR(generateBaseQuery(fields, key, forward ? kAfter : kBefore, true, query));
        query += " limit ";
        query += String::from(static_cast<unsigned long long>(offset) + count);
    }
    String type;
    TRELM_RETURN_IF_ERROR(getObjectType(type));

    // The answer is read whole and skipped here rather than by the parser, so that a refill that
    // overshoots the result can still keep the rows nearest to the wanted one.
    Vector<Map<String, String>> rows;
    unsigned total = 0;
    TRELM_RETURN_IF_ERROR(library_->runFqlQuery(query, type, rows, 0, total));
    total = rows.size();

    Vector<Map<String, String>> kept;
    unsigned first = 0;
    unsigned last = total;  // exclusive
    if (!paged_) {
        first = std::min(offset, total);
    } else if (offset < total) {
        first = offset;
        last = std::min<unsigned long long>(total, static_cast<unsigned long long>(offset) + count);
    } else {
        first = total > count ? total - count : 0;
    }
    err = kept.reserve(last - first);
    if (err.failed()) return err;
    for (unsigned i = first; i < last; ++i) {
        TRELM_RETURN_IF_ERROR(kept.pushBack(std::move(rows[i])));
    }

    if (!kept.empty()) {
        TRELM_RETURN_IF_ERROR(convertItems(kept, paged_ ? forward : true, convertError));
    } else if (!key) {
        // Nothing at all from the start or the end: the result is empty.
        TRELM_RETURN_IF_ERROR(clearWindow());
    }
    windowLoaded_ = true;
    if (!paged_) {
        rowCount_ = total;
        rowCountKnown_ = true;
    } else if (!key && offset == 0 && kept.size() < count) {
        // A short page read from an end of the result holds all of it.
        rowCount_ = kept.size();
        rowCountKnown_ = true;
    }

    got = total;
    if (offset < got) return TRELM_OK();
    return TRELM_ERROR(kNoData);
}

uError FacebookSource::FqlCursorBase::convertItems(Vector<Map<String, String>> const& rows, bool forward,
                                                   int& convertError) {
    convertError = -1;
    Vector<RecordPtr> fresh(16);
    uError err = fresh.reserve(rows.size());
    if (err.failed()) return err;
    for (unsigned i = 0; i < rows.size(); ++i) {
        RecordPtr record = makeSmart<Record>();
        err = convertItem(rows[i], record, convertError);
        if (err.failed()) {
            if (convertError < 0) convertError = static_cast<int>(i);
            return err;
        }
        if (err.code() == kNoData) continue;
        TRELM_RETURN_IF_ERROR(fresh.pushBack(std::move(record)));
    }
    if (!forward) std::reverse(fresh.begin(), fresh.end());

    err = clearWindow();
    if (err.failed()) return err;
    static String const objectIdKey("core_object_id");
    for (RecordPtr& record : fresh) {
        Metadata::Key key;
        String serviceId;
        TRELM_RETURN_IF_ERROR(getSid(record, key, serviceId));
        GUID guid;
        TRELM_RETURN_IF_ERROR(cache_->getGuid(tag_, MappingCache::SidMapKey(key, serviceId), true, guid));
        TRELM_RETURN_IF_ERROR(record->insert(objectIdKey, Variant(guid)));
        TRELM_RETURN_IF_ERROR(cache_->setItem(tag_, key, record));
    }
    window_ = std::move(fresh);
    position_ = 0;
    return postConvert(window_);
}

uError FacebookSource::FqlCursorBase::postConvert(Vector<RecordPtr>& /*window*/) { return TRELM_OK(); }

void FacebookSource::FqlCursorBase::setEmptyResult() {
    noMoreData_ = true;
    rowCountKnown_ = true;
    rowCount_ = 0;
    windowLoaded_ = true;
}

uError FacebookSource::FqlCursorBase::addPrototype(Record const& prototype, RecordPtr& record) {
    try {
        if (record->empty()) {
            *record = prototype;
            return TRELM_OK();
        }
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    for (auto const& [key, value] : prototype) TRELM_RETURN_IF_ERROR(record->insert(key, value));
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::stringSid(RecordPtr const& record, Metadata::Key const& sidKey,
                                                char const* missing, Metadata::Key& key, String& serviceId) {
    Variant const* value = record->search(sidKey.name());
    if (value == nullptr) return TRELM_ERROR_MSG(kInvalid, missing);
    String id;
    TRELM_RETURN_IF_ERROR(value->as(id));
    key = sidKey;
    serviceId = std::move(id);
    return TRELM_OK();
}

uError FacebookSource::FqlCursorBase::copyField(Map<String, String> const& row, String const& field,
                                                String const& recordKey, RecordPtr& record) {
    TRELM_TYPES::TYPES type = TRELM_TYPES::STRING;
    // An unregistered key is kept as text.
    Metadata::getType(recordKey, type).ignore();
    return copyField(row, field, recordKey, type, record);
}

uError FacebookSource::FqlCursorBase::copyField(Map<String, String> const& row, String const& field,
                                                String const& recordKey, TRELM_TYPES::TYPES type, RecordPtr& record) {
    String const* text = row.search(field);
    if (text == nullptr) return TRELM_OK();
    Variant value;
    uError err;
    switch (type) {
        case TRELM_TYPES::UINT32: {
            unsigned n = 0;
            err = text->to(n);
            value = n;
            break;
        }
        case TRELM_TYPES::INT32: {
            int n = 0;
            err = text->to(n);
            value = n;
            break;
        }
        case TRELM_TYPES::INT64:
        case TRELM_TYPES::UINT64: {
            long long n = 0;
            err = text->to(n);
            value = n;
            break;
        }
        case TRELM_TYPES::BOOL: {
            bool b = false;
            err = Variant(*text).as(b);
            value = b;
            break;
        }
        default:
            value = *text;
            break;
    }
    if (err.failed()) return TRELM_WRAP_MSG(kInvalid, err, "field " + field + " does not convert");
    return record->insert(recordKey, std::move(value));
}

uError FacebookSource::FqlCursorBase::ensureLoaded() {
    if (windowLoaded_ || noMoreData_) return TRELM_OK();
    return jumpBeginning();
}

uError FacebookSource::FqlCursorBase::clearWindow() {
    window_.clear();
    position_ = 0;
    return cache_->clearItems(tag_);
}

}  // namespace trelm
