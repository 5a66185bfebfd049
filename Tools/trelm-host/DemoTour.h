#pragma once

#include <ctime>
#include <string>

#include "Printer.h"
#include "SourceClient.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The guided tour of the demo: five steps against the data source, each announced with a "step"
// line and followed by what it produced.
//   1. sign in (or reuse the stored session)
//   2. list the first `friends` friends as contact records, with the total the source counts
//   3. post a status (the given text, or a greeting with the time)
//   4. upload a photo (the given file, or a small PNG built into the host, written to the state
//      folder) and show its "core_service_id"
//   5. fetch the first listed record again by its GUID and check that it equals the listing's
// The tour stops at the first step that fails and returns that step's error.
//
// Thread safety: used by the host's controlling thread.
class DemoTour {
public:
    struct Options {
        unsigned friends = 10;
        std::string status;  // empty: defaultStatus(now)
        std::string photo;   // empty: the built-in image
    };

    // `stateFolder` receives the built-in image when no photo is given.
    DemoTour(Options options, std::string stateFolder);

    uError run(SourceClient& client, Printer& printer);

    // "Hello from trelm-host (2024-05-01 12:00:00 UTC)".
    static std::string defaultStatus(std::time_t now);
    // Writes the built-in 8x8 PNG into `folder` as "demo-photo.png" and gives its path.
    static uError writeBuiltInPhoto(std::string const& folder, std::string& path);

private:
    Options const options_;
    std::string const stateFolder_;
};

}  // namespace host
}  // namespace trelm
