#include "EmulatorHost.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "ErrorAssertions.h"

namespace trelm::test {

EmulatorHost::EmulatorHost(emu::GeneratorOptions const& generator) {
    emu::Emulator::Options options;
    options.generator = generator;
    emulator_ = std::make_unique<emu::Emulator>(options);
}

EmulatorHost::~EmulatorHost() {
    // Teardown: a name that is already gone needs nothing more.
    for (String const& name : registered_) registry_.remove(name).ignore();
    registry_.deactivate();
    sources_.clear();
    emulator_->stop();
}

bool EmulatorHost::start(std::string& error) {
    if (!emulator_->start(error)) return false;
    http_.setCaFile(emulator_->caFile().c_str());
    http_.setConnectTo({
        String("api.facebook.com:80:127.0.0.1:" + std::to_string(emulator_->httpPort())),
        String("api.facebook.com:443:127.0.0.1:" + std::to_string(emulator_->httpsPort())),
    });
    addComponent(HttpRequestFactory::kName, http_);
    addComponent(RuntimeConfiguration::kName, runtime_);
    registry_.activate();
    return true;
}

Configuration::Group EmulatorHost::demoGroup(String const& name, bool session) {
    Map<String, Variant> values{{"facebook_source_appkey", Variant(emu::DemoAccount::apiKey)},
                                {"facebook_source_appsecret", Variant(emu::DemoAccount::appSecret)}};
    if (session) {
        emu::Session s = emulator_->loginDemo();
        EXPECT_OK(values.insert("facebook_source_session_user", Variant(String::from(static_cast<long long>(s.uid)))));
        EXPECT_OK(values.insert("facebook_source_session_id", Variant(String(s.key))));
        EXPECT_OK(values.insert("facebook_source_session_secret", Variant(String(s.secret))));
    }
    return Configuration::Group(name, values);
}

FacebookSource& EmulatorHost::addSource(Configuration::Group const& group, bool configure) {
    sources_.push_back(std::make_unique<FacebookSource>(group.name()));
    FacebookSource& source = *sources_.back();
    addComponent(group.name(), source);
    if (configure) {
        EXPECT_OK(source.sendConfig(group));
        EXPECT_OK(source.startup());
    }
    return source;
}

void EmulatorHost::addComponent(String const& name, Component& component) {
    EXPECT_OK(registry_.add(name, &component));
    registered_.push_back(name);
}

SmartPtr<FacebookLibrary> EmulatorHost::demoClient() {
    emu::Session session = emulator_->loginDemo();
    auto info = makeSmart<FacebookLibrary::ConnectionInfo>("reference");
    EXPECT_OK(info->setAppConfig(emu::DemoAccount::apiKey, emu::DemoAccount::appSecret));
    EXPECT_OK(info->setSessionConfig(String(session.key), String(session.secret),
                                     String::from(static_cast<long long>(session.uid)), false, false));
    auto lib = makeSmart<FacebookLibrary>();
    EXPECT_OK(lib->setup(info));
    return lib;
}

std::vector<std::string> EmulatorHost::fqlStatements() {
    std::vector<std::string> out;
    for (emu::LoggedRequest const& r : emulator_->log().entriesFor("fql.query")) out.push_back(r.fql);
    return out;
}

EmulatorHost::Cursor EmulatorHost::open(FacebookSource& source, int type, Vector<IQueryItems::Column> const& columns,
                                        std::vector<IQueryItems::Constraint> const& extra, std::int64_t position) {
    Vector<IQueryItems::Constraint> constraints{IQueryItems::Constraint{
        Metadata::Key("core_object_type", TRELM_TYPES::INT32), Variant(type), IQueryItems::Constraint::Equal}};
    for (auto const& c : extra) EXPECT_OK(constraints.pushBack(c));
    IQueryItems::StartQueryMessage msg(columns, constraints, position);
    msg.interactive = position == -1;
    EXPECT_OK(source.onMessage(msg));
    return msg.cursor;
}

std::vector<EmulatorHost::Record> EmulatorHost::walk(IQueryItems::ICursor& cursor, int step) {
    std::vector<Record> rows;
    for (int moved = step; moved != 0;) {
        SmartPtr<Record> row;
        uError err = cursor.getRow(row);
        if (err.code() == kNoData) break;
        EXPECT_OK(err) << "after " << rows.size() << " rows";
        if (!row) break;
        rows.push_back(*row);
        EXPECT_OK(err = cursor.seek(step, moved)) << "from row " << rows.size();
        if (err.failed()) break;
    }
    if (step < 0) std::reverse(rows.begin(), rows.end());
    return rows;
}

std::string EmulatorHost::text(Record const& record, char const* key) {
    Variant const* v = record.search(key);
    return v ? v->asString().str() : "<none>";
}

Vector<IQueryItems::Column> EmulatorHost::eventOrdering() {
    return Vector<IQueryItems::Column>{{Metadata::Key("core_object_time", TRELM_TYPES::INT32), false},
                                       {Metadata::Key("core_event_service", TRELM_TYPES::STRING), false},
                                       {Metadata::Key("core_event_serviceid", TRELM_TYPES::STRING), false}};
}

}  // namespace trelm::test
