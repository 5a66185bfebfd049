#include "DemoTour.h"

#include <filesystem>
#include <fstream>
#include <utility>

#include "ItemQuery.h"
#include "trelm/Metadata.h"

namespace trelm {
namespace host {

namespace {

// An 8x8 RGB gradient: a complete, valid PNG, small enough to keep in the program.
unsigned char const kBuiltInPhoto[] = {
    0x89, 0x50, 0x4e, 0x47, 0x0d, 0x0a, 0x1a, 0x0a, 0x00, 0x00, 0x00, 0x0d, 0x49, 0x48, 0x44, 0x52,
    0x00, 0x00, 0x00, 0x08, 0x00, 0x00, 0x00, 0x08, 0x08, 0x02, 0x00, 0x00, 0x00, 0x4b, 0x6d, 0x29,
    0xdc, 0x00, 0x00, 0x00, 0x6d, 0x49, 0x44, 0x41, 0x54, 0x78, 0xda, 0x15, 0xce, 0x51, 0x11, 0x00,
    0x51, 0x08, 0x42, 0x51, 0xa3, 0x18, 0x85, 0x28, 0x44, 0x31, 0xca, 0x8d, 0x42, 0x14, 0xa2, 0xec,
    0x5b, 0x3f, 0x39, 0x0c, 0xe3, 0xcc, 0xb0, 0x83, 0x06, 0x0f, 0x37, 0x30, 0x64, 0xe8, 0x30, 0xb3,
    0xec, 0xa2, 0xc5, 0xcb, 0x2d, 0x2c, 0x59, 0xba, 0x0f, 0xc4, 0x0a, 0x09, 0x8b, 0x13, 0x88, 0x88,
    0xea, 0x81, 0x59, 0x23, 0x63, 0x73, 0x06, 0x13, 0x53, 0x3f, 0x38, 0xf6, 0xd0, 0xe1, 0xe3, 0x0e,
    0x8e, 0x1c, 0xbd, 0x07, 0xff, 0xec, 0x1b, 0x78, 0xd5, 0x17, 0xfe, 0x17, 0xe8, 0x7b, 0x62, 0xc2,
    0x06, 0x05, 0x87, 0xcb, 0x1f, 0x27, 0x34, 0x0f, 0xca, 0x16, 0x15, 0x97, 0xeb, 0x5f, 0x4e, 0x69,
    0xf9, 0x00, 0xde, 0xa8, 0x60, 0x01, 0xb4, 0x9b, 0xb4, 0x6d, 0x00, 0x00, 0x00, 0x00, 0x49, 0x45,
    0x4e, 0x44, 0xae, 0x42, 0x60, 0x82,
};

}  // namespace

DemoTour::DemoTour(Options options, std::string stateFolder)
    : options_(std::move(options)), stateFolder_(std::move(stateFolder)) {}

std::string DemoTour::defaultStatus(std::time_t now) {
    std::tm utc{};
    gmtime_r(&now, &utc);
    char stamp[32];
    std::strftime(stamp, sizeof stamp, "%Y-%m-%d %H:%M:%S UTC", &utc);
    return std::string("Hello from trelm-host (") + stamp + ")";
}

uError DemoTour::writeBuiltInPhoto(std::string const& folder, std::string& path) {
    std::string file = (std::filesystem::path(folder) / "demo-photo.png").string();
    std::ofstream out(file, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<char const*>(kBuiltInPhoto), sizeof kBuiltInPhoto);
    out.close();
    if (!out) return TRELM_ERROR_MSG(kFailure, "cannot write the demo photo " + file);
    path = file;
    return TRELM_OK();
}

uError DemoTour::run(SourceClient& client, Printer& printer) {
    printer.step(1, "sign in");
    printer.finish();
    TRELM_RETURN_IF_ERROR(client.open());

    printer.step(2, "list the first " + std::to_string(options_.friends) + " friends of " +
                        client.sourceName().str());
    ItemQuery friends(*ItemQuery::findKind(Metadata::Object::TYPE_CONTACT));
    friends.limit = options_.friends;
    SourceClient::Listing listing;
    uError e = client.query(friends, listing);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "listing the friends failed");
    for (std::size_t i = 0; i < listing.rows.size(); ++i) {
        printer.record(static_cast<unsigned>(i + 1), listing.rows[i]);
    }
    printer.listed(Metadata::Object::TYPE_CONTACT, listing.rows.size(), listing.total);
    printer.finish();

    std::string status = options_.status.empty() ? defaultStatus(std::time(nullptr)) : options_.status;
    printer.step(3, "post the status \"" + status + "\"");
    e = client.postStatus(String(status));
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "posting the status failed");
    printer.inserted(Metadata::Object::TYPE_STATUS, std::nullopt);
    printer.finish();

    std::string photo = options_.photo;
    if (photo.empty()) {
        TRELM_RETURN_IF_ERROR(writeBuiltInPhoto(stateFolder_, photo));
    }
    printer.step(4, "upload the photo " + photo);
    String photoId;
    e = client.uploadPhoto(photo, String("Uploaded by the trelm-host demo"), String(), photoId);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "uploading the photo failed");
    printer.inserted(Metadata::Object::TYPE_MEDIA, photoId);
    printer.finish();

    printer.step(5, "fetch the first listed friend again by its GUID");
    SourceClient::Record const* first = client.listed(1);
    if (first == nullptr) return TRELM_ERROR_MSG(kNotFound, "no friend was listed to fetch again");
    GUID guid;
    Variant const* id = first->search("core_object_id");
    if (id == nullptr || id->as(guid).failed()) {
        return TRELM_ERROR_MSG(kNotFound, "the first listed friend has no core_object_id");
    }
    SourceClient::Record again;
    e = client.retrieve(guid, again);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "fetching " + guid.toString().str() + " failed");
    printer.retrieved(guid.toString(), again);
    printer.check("the fetched record equals the listed one", again == *first);
    printer.finish();
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
