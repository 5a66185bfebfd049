#pragma once

#include "BaseSource.h"
#include "trelm/String.h"

namespace trelm {

// The data source of the Facebook plug-in: answers the host's item queries with cursors over the
// service, and posts statuses and photos that the host inserts.
//
// Lifetime: made by the plug-in's component factory and owned by the host.
// Thread safety: see the full declaration.
class FacebookSource : public BaseSource {
public:
    static constexpr char const* kComponentId = "@trelm.example:/facebooksource";

    explicit FacebookSource(String name);
    ~FacebookSource() override;
};

}  // namespace trelm
