#pragma once

#include <cstdint>

#include "trelm/String.h"

namespace trelm {
namespace NetworkMetadata {

// A peer (friend) on a social network as a connector reports it.
struct tRELMNetworkPeer {
    String serviceId;  // the service's user id
    String firstName;
    String lastName;
    String fullName;
    String profileUrl;
};

// A peer's status event.
struct tRELMNetworkEvent {
    String statusText;
    std::int64_t statusTime = 0;  // seconds since the epoch
};

}  // namespace NetworkMetadata
}  // namespace trelm
