#pragma once

#include "Component.h"
#include "ConfigurationChangedMessage.h"
#include "IMessage.h"
#include "IQueryItems.h"
#include "trelm/Export.h"
#include "trelm/GUID.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

namespace trelm {

// The base of a data source of the host's item store. Besides the Component entry points it
// offers the host's data entry points, each running a fixed sequence of hooks that stops at the
// first failure and returns it (otherwise the last hook's result):
//   insert(record)            manageInputDataImpl(record, false) -> insertData -> postInsert
//   update(record)            manageUpdateDataImpl(record, {})   -> updateData -> postUpdate
//   remove(guid, flag)        removeData(guid, flag)             -> postRemove
//   markInvisible(guid)       markDataInvisible                  -> postMarkInvisible
//   retrieve(guid, rec, flag) retrieveData                       -> modifyRetrievedData
//   startQuery(msg, inter.)   checkQuery(msg, inter.)            -> doStartQuery(msg, inter.)
// Messages: "ConfigurationChangedMessage" goes to configurationChangedImpl and
// "IQueryItems::StartQueryMessage" to startQuery(msg, msg.interactive); anything else succeeds.
//
// Defaults: the data operations themselves (insertData, updateData, removeData,
// markDataInvisible, retrieveData) answer kDataOpNotSupported; doStartQuery answers kNotSupported;
// the manage/modify/post hooks, checkQuery and configurationChangedImpl succeed.
// Thread safety: as Component.
class TRELM_API BaseSource : public Component {
public:
    using Record = Map<String, Variant>;

    BaseSource(String const& name, String const& componentId);
    ~BaseSource() override;

    uError insert(Record& record);
    uError update(Record& record);
    uError remove(GUID const& guid, bool flag);
    uError markInvisible(GUID const& guid);
    uError retrieve(GUID const& guid, Record& record, bool flag);
    uError startQuery(IQueryItems::StartQueryMessage& msg, bool interactive);

    // Record helpers. A missing key, or (for the NotEmpty forms) an empty text, gives kInvalid;
    // a value that does not convert gives kInvalid wrapping the conversion's error. `out` is
    // written only on success.
    static uError fieldRequired(Record const& record, String const& key, int& out);
    static uError fieldRequiredNotEmpty(Record const& record, String const& key, String& out);
    static uError fieldRequiredStringNotEmpty(Record const& record, String const& key);
    // Absent: present = false, success, value untouched. Present: present = true and value
    // = its text, or kInvalid wrapping the conversion's error.
    static uError fieldOptional(Record const& record, String const& key, bool& present, String& value);

protected:
    uError handleMessage(IMessage& msg) override;

    virtual uError configurationChangedImpl(ConfigurationChangedMessage& msg);

    virtual uError manageInputDataImpl(Record& record, bool flag);
    virtual uError manageUpdateDataImpl(Record& record, Record const& previous);
    virtual uError modifyRetrievedData(Record& record);
    virtual uError insertData(Record& record);
    virtual uError postInsert(Record const& record);
    virtual uError updateData(Record& record);
    virtual uError postUpdate(Record const& record);
    virtual uError markDataInvisible(GUID const& guid);
    virtual uError postMarkInvisible(GUID const& guid);
    virtual uError removeData(GUID const& guid, bool flag);
    virtual uError postRemove(GUID const& guid);
    virtual uError retrieveData(GUID const& guid, Record& record, bool flag);
    virtual uError checkQuery(IQueryItems::StartQueryMessage const& msg, bool interactive);
    virtual uError doStartQuery(IQueryItems::StartQueryMessage& msg, bool interactive);
};

}  // namespace trelm
