#include "LoginListener.h"

#include "LoginStatusMessage.h"

namespace trelm {
namespace host {

LoginListener::LoginListener() : Component(kName, kName) {}

LoginListener::~LoginListener() = default;

std::size_t LoginListener::count() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return statuses_.size();
}

std::vector<LoginListener::Status> LoginListener::since(std::size_t from, String const& tag) const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<Status> found;
    for (std::size_t i = from; i < statuses_.size(); ++i) {
        if (statuses_[i].tag == tag) found.push_back(statuses_[i]);
    }
    return found;
}

uError LoginListener::handleMessage(IMessage& msg) {
    if (msg.type() != ILoginStatus::LoginStatusMessage::kType) return TRELM_OK();
    auto const* status = dynamic_cast<ILoginStatus::LoginStatusMessage const*>(&msg);
    if (status == nullptr) return TRELM_OK();  // the name without the class: not ours to judge
    std::lock_guard<std::mutex> lock(mutex_);
    statuses_.push_back(Status{status->tag, status->status, status->userId});
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
