// A stand-in for a plug-in: built with hidden visibility like the real one, it handles messages
// made by its host and sends messages that its host must recognise.
#include "BaseSource.h"
#include "GetUserSidMessage.h"
#include "WakeupMessage.h"

namespace {

class ModuleSource : public trelm::BaseSource {
public:
    explicit ModuleSource(trelm::String name) : BaseSource(name, "@test:/module") {}

protected:
    trelm::uError handleMessage(trelm::IMessage& msg) override {
        if (auto* wakeup = dynamic_cast<trelm::WakeupMessage*>(&msg)) {
            return wakeup->params.insert("answered_by", name());
        }
        return BaseSource::handleMessage(msg);
    }
    trelm::uError configurationChangedImpl(trelm::ConfigurationChangedMessage& msg) override {
        return msg.keys.contains("module_key") ? TRELM_OK() : TRELM_ERROR(trelm::kInvalid);
    }
};

}  // namespace

extern "C" __attribute__((visibility("default"))) trelm::Component* hiddenModuleComponent(
    trelm::String name) {
    return new ModuleSource(name);
}

extern "C" __attribute__((visibility("default"))) unsigned hiddenModuleAskUserSid(
    char const* target, trelm::String* result) {
    trelm::IServiceSource::GetUserSidMessage msg;
    trelm::uError e = msg.send(target);
    *result = msg.result;
    return e.code();
}
