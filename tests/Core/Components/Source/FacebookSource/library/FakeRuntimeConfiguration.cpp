#include "FakeRuntimeConfiguration.h"

#include "GetRuntimeConfigurationMessage.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"

namespace trelm::test {

FakeRuntimeConfiguration::FakeRuntimeConfiguration() : Component("RuntimeConfiguration", "RuntimeConfiguration") {}

FakeRuntimeConfiguration::~FakeRuntimeConfiguration() = default;

void FakeRuntimeConfiguration::failType(String const& type) {
    std::lock_guard<std::mutex> lock(mutex_);
    failType_ = type;
}

void FakeRuntimeConfiguration::put(String const& tag, String const& key, String const& value) {
    std::lock_guard<std::mutex> lock(mutex_);
    Map<String, String>* values = store_.search(tag);
    if (values == nullptr) {
        store_.insert(tag, Map<String, String>());
        values = store_.search(tag);
    }
    values->insert(key, value);
}

bool FakeRuntimeConfiguration::get(String const& tag, String const& key, String& out) const {
    std::lock_guard<std::mutex> lock(mutex_);
    Map<String, String> const* values = store_.search(tag);
    String const* value = values ? values->search(key) : nullptr;
    if (value == nullptr) return false;
    out = *value;
    return true;
}

std::vector<FakeRuntimeConfiguration::Record> FakeRuntimeConfiguration::records() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return records_;
}

void FakeRuntimeConfiguration::clearRecords() {
    std::lock_guard<std::mutex> lock(mutex_);
    records_.clear();
}

uError FakeRuntimeConfiguration::handleMessage(IMessage& msg) {
    Record record;
    record.type = msg.type();
    bool fail = false;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        fail = failType_ == "*" || failType_ == msg.type();
    }
    if (msg.type() == RuntimeConfigurationMessage::kType) {
        auto& store = static_cast<RuntimeConfigurationMessage&>(msg);
        record.tag = store.tag;
        for (Configuration::Value const& value : store.values) record.values.insert(value.key(), value.value().asString());
        if (!fail) {
            for (auto const& [key, text] : record.values) put(store.tag, key, text);
        }
    } else if (msg.type() == ResetRuntimeConfigurationMessage::kType) {
        auto& reset = static_cast<ResetRuntimeConfigurationMessage&>(msg);
        record.tag = reset.tag;
        record.keys = reset.keys;
        if (!fail) {
            std::lock_guard<std::mutex> lock(mutex_);
            if (Map<String, String>* values = store_.search(reset.tag)) {
                for (String const& key : reset.keys) values->remove(key);
            }
        }
    } else if (msg.type() == GetRuntimeConfigurationMessage::kType) {
        auto& get = static_cast<GetRuntimeConfigurationMessage&>(msg);
        record.tag = get.tag;
        for (auto const& entry : get.values) record.keys.insert(entry.first);
        if (!fail) {
            for (auto& entry : get.values) {
                String value;
                if (this->get(get.tag, entry.first, value)) entry.second = value;
            }
        }
    } else {
        return TRELM_OK();  // broadcasts meant for others
    }
    std::lock_guard<std::mutex> lock(mutex_);
    records_.push_back(record);
    return fail ? TRELM_ERROR(kFailure) : TRELM_OK();
}

}  // namespace trelm::test
