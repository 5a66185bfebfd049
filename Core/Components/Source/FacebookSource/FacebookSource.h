#pragma once

#include <cstdint>
#include <mutex>

#include "BaseSource.h"
#include "ConfigurationChangedMessage.h"
#include "FacebookLibrary.h"
#include "IMessage.h"
#include "IQueryItems.h"
#include "trelm/Configuration.h"
#include "trelm/GUID.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The data source of the Facebook plug-in. It answers the host's item queries with cursors over
// the service (contacts, albums, media and photo tags so far; the other object kinds answer
// kNotSupported until their cursors exist), posts a status or uploads a photo when the host inserts one, and hands back
// the records its cursors produced when the host asks for one by GUID.
//
// Life of a source:
//   FacebookSource src("facebook");   // nothing exists yet
//   src.sendConfig(group);            // a fresh ConnectionInfo from the group (may be repeated)
//   src.startup();                    // a FacebookLibrary set up with it, then a MappingCache
//   ... queries, data operations, configuration changes ...
//   src.shutdown();                   // releases nothing; the destructor drops the references
// A query or data operation before startup fails with kNotSet; "IServiceSource::GetUserSidMessage"
// before sendConfig fails with kNotSet too.
//
// Ownership: the source holds its ConnectionInfo, FacebookLibrary and MappingCache by SmartPtr.
// Every cursor it opens holds further references to the same client and cache, so both live as
// long as the last cursor, even after a new startup replaced the source's own references.
//
// Thread safety: the host may call hooks, data operations and queries from several threads. The
// three references and the two flags are guarded by mutex_; they are copied out under it and used
// without it, so no lock is held while the client talks to the service or sends messages. The
// client and the cache guard their own state.
class FacebookSource : public BaseSource {
public:
    // Component identifier, the same literal the plug-in's component table uses.
    static constexpr char const* kComponentId = "@trelm.example:/facebooksource";

    // The identity cache shared by the source and its cursors. Defined in MappingCache.h.
    class MappingCache;
    // The base of the cursors that page through FQL answers. Defined in FqlCursorBase.h.
    class FqlCursorBase;

    explicit FacebookSource(String name);
    ~FacebookSource() override;

    // The object kinds this source serves (values of "core_object_type").
    static constexpr int kContact = 2;
    static constexpr int kStatus = 4;
    static constexpr int kPhotoEvent = 5;
    static constexpr int kMedia = 9;
    static constexpr int kMessage = 10;
    static constexpr int kAlbum = 11;
    static constexpr int kFriendRequest = 12;
    static constexpr int kPhotoTag = 13;

    // The object type a query asks for, by the rules doStartQuery applies before it makes a
    // cursor: "core_object_type" constraints (Equal: one type, unknown types ignored; InList: the
    // types listed) narrow the eight kinds above, "core_object_source" must name `sourceName`;
    // exactly one kind may remain, or the pair 4 and 5 (served together, as 4). A `position` other
    // than -1 is only for albums, media and photo tags with `flag` false; contacts, status posts,
    // photo posts and messages need `flag` true.
    // Codes: kNotSupported (another comparison on the type, another source, no or several kinds
    // left), kInvalid (a value of the wrong kind, a position that can't be used), kNoData (a kind
    // that needs `flag` true asked for with false).
    static uError selectObjectType(Vector<IQueryItems::Constraint> const& constraints, std::int64_t position, bool flag,
                                   String const& sourceName, int& type);

protected:
    uError sendConfigImpl(Configuration::Group const& group) override;
    uError startupImpl() override;
    uError shutdownImpl() override;
    uError preMessageImpl(IMessage& msg) override;
    uError configurationChangedImpl(ConfigurationChangedMessage& msg) override;

    uError insertData(Record& record) override;
    uError updateData(Record& record) override;
    uError removeData(GUID const& guid, bool flag) override;
    uError retrieveData(GUID const& guid, Record& record, bool flag) override;
    uError doStartQuery(IQueryItems::StartQueryMessage& msg, bool flag) override;

    // An input check over a const record: with `flag` true kDataOpNotSupported; type 4 needs a
    // non-empty "core_event_text", type 9 a non-empty "media_uri", any other type is kInvalid.
    // It does not replace the base's manageInputDataImpl(Record&, bool), which keeps the base's
    // behaviour during insert(); nothing in the plug-in calls this one.
    using BaseSource::manageInputDataImpl;
    virtual uError manageInputDataImpl(Record const& record, bool flag);

private:
    // The session block and the login block of configurationChangedImpl.
    uError applySessionChange(ConfigurationChangedMessage const& msg, SmartPtr<FacebookLibrary> const& library);
    uError applyLoginChange(ConfigurationChangedMessage const& msg,
                            SmartPtr<FacebookLibrary::ConnectionInfo> const& info,
                            SmartPtr<FacebookLibrary> const& library);
    // Copies of the references, taken under mutex_.
    SmartPtr<FacebookLibrary::ConnectionInfo> connectionInfoRef() const;
    void startedRefs(SmartPtr<FacebookLibrary>& library, SmartPtr<MappingCache>& cache) const;

    // Guards the five fields below (not the objects they point to).
    mutable StdMutex mutex_;
    SmartPtr<FacebookLibrary::ConnectionInfo> connectionInfo_ TRELM_GUARDED_BY(mutex_);
    SmartPtr<FacebookLibrary> library_ TRELM_GUARDED_BY(mutex_);
    SmartPtr<MappingCache> mappingCache_ TRELM_GUARDED_BY(mutex_);
    bool haveExtendedApi_ TRELM_GUARDED_BY(mutex_) = true;
    // Always !haveExtendedApi_: the session comes from the configuration, not from a login.
    bool useConfiguredSession_ TRELM_GUARDED_BY(mutex_) = false;
};

}  // namespace trelm
