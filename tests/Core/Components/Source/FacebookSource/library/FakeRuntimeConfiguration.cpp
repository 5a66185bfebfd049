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
    store_[tag + "/" + key] = value;
}

String FakeRuntimeConfiguration::get(String const& tag, String const& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto const found = store_.find(tag + "/" + key);
    return found != store_.end() ? found->second : String("<none>");
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
        for (Configuration::Value const& v : m.values) {
            TRELM_RETURN_IF_ERROR(record.values.insert(v.key(), v.value().asString()));
        }
        for (auto const& [key, text] : record.values) {
            if (!fail) store_[m.tag + "/" + key] = text;
        }
    } else if (msg.type() == ResetRuntimeConfigurationMessage::kType) {
        auto& m = static_cast<ResetRuntimeConfigurationMessage&>(msg);
        record.tag = m.tag;
        record.keys = m.keys;
        for (String const& key : m.keys) {
            if (!fail) store_.erase(m.tag + "/" + key);
        }
    } else if (msg.type() == GetRuntimeConfigurationMessage::kType) {
        auto& m = static_cast<GetRuntimeConfigurationMessage&>(msg);
        record.tag = m.tag;
        for (auto& [key, value] : m.values) {
            TRELM_RETURN_IF_ERROR(record.keys.insert(key));
            auto const stored = store_.find(m.tag + "/" + key);
            if (stored != store_.end() && !fail) value = stored->second;
        }
    } else {
        return TRELM_OK();  // a broadcast meant for others
    }
    records_.push_back(record);
    return fail ? TRELM_ERROR(kFailure) : TRELM_OK();
}

}  // namespace trelm::test
