#include "FakeRuntimeConfiguration.h"

#include "GetRuntimeConfigurationMessage.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"

namespace trelm::test {

void FakeRuntimeConfiguration::failType(String const& type) {
    std::lock_guard<std::mutex> lock(mutex_);
    failType_ = type;
}

void FakeRuntimeConfiguration::put(String const& tag, String const& key, String const& value) {
    std::lock_guard<std::mutex> lock(mutex_);
    store_.insert(tag + "/" + key, value);
}

String FakeRuntimeConfiguration::get(String const& tag, String const& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    String const* value = store_.search(tag + "/" + key);
    return value ? *value : String("<none>");
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
    std::lock_guard<std::mutex> lock(mutex_);
    bool const fail = failType_ == msg.type();
    Record record{msg.type(), {}, {}, {}};
    if (msg.type() == RuntimeConfigurationMessage::kType) {
        auto& m = static_cast<RuntimeConfigurationMessage&>(msg);
        record.tag = m.tag;
        for (Configuration::Value const& v : m.values) record.values.insert(v.key(), v.value().asString());
        for (auto const& [key, text] : record.values) {
            if (!fail) store_.insert(m.tag + "/" + key, text);
        }
    } else if (msg.type() == ResetRuntimeConfigurationMessage::kType) {
        auto& m = static_cast<ResetRuntimeConfigurationMessage&>(msg);
        record.tag = m.tag;
        record.keys = m.keys;
        for (String const& key : m.keys) {
            if (!fail) store_.remove(m.tag + "/" + key);
        }
    } else if (msg.type() == GetRuntimeConfigurationMessage::kType) {
        auto& m = static_cast<GetRuntimeConfigurationMessage&>(msg);
        record.tag = m.tag;
        for (auto& [key, value] : m.values) {
            record.keys.insert(key);
            String const* stored = store_.search(m.tag + "/" + key);
            if (stored && !fail) value = *stored;
        }
    } else {
        return TRELM_OK();  // a broadcast meant for others
    }
    records_.push_back(record);
    return fail ? TRELM_ERROR(kFailure) : TRELM_OK();
}

}  // namespace trelm::test
