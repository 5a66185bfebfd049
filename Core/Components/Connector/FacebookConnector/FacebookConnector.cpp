#include "FacebookConnector.h"

#include <utility>

namespace trelm {

String const facebookStatusFields("");
String const facebookPeerInfoFields("uid,first_name,last_name,name,profile_url");

FacebookConnector::FacebookConnector(String name) : BaseConnector(std::move(name), id()) {}

FacebookConnector::~FacebookConnector() = default;

String FacebookConnector::id() { return String("@trelm.example:/facebookconnector"); }

}  // namespace trelm
