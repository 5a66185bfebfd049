// A small in-memory stand-in for the emulator's store: the demo application and account, and
// methods that answer fixed content, so that protocol tests do not depend on generated data.
#pragma once

#include <atomic>
#include <string>

#include "Store.h"

namespace emu::test {

class FakeStore : public Store {
public:
    std::atomic<int> calls{0};  // method calls that reached the store

    Status generate(const GeneratorOptions&) override { return std::nullopt; }

    std::optional<std::string> appSecret(const std::string& apiKey) override {
        if (apiKey == DemoAccount::apiKey) return std::string(DemoAccount::appSecret);
        return std::nullopt;
    }
    std::optional<std::int64_t> checkLogin(const std::string& email, const std::string& password) override {
        if (email == DemoAccount::email && password == DemoAccount::password) return DemoAccount::uid;
        return std::nullopt;
    }

    Status fqlQuery(std::int64_t viewer, const std::string& query, XmlNode& root) override {
        ++calls;
        if (query.find("SELECT") != 0) return ServiceError{601, "Parser error: unexpected '" + query + "' at position 0."};
        XmlNode& user = root.add("user");
        user.add("uid", std::to_string(viewer));
        user.add("name", "Demo User");
        return std::nullopt;
    }
    Status streamGet(std::int64_t, const std::string&, const std::string&, const std::string&, const std::string&,
                     XmlNode& root) override {
        ++calls;
        root.addList("posts");
        root.addList("profiles");
        root.addList("albums");
        return std::nullopt;
    }
    Status getInbox(std::int64_t, const std::string&, const std::string&, XmlNode&) override {
        ++calls;
        return std::nullopt;
    }
    Status getThreadMessages(std::int64_t, const std::string&, const std::string&, const std::string&,
                             XmlNode&) override {
        ++calls;
        return std::nullopt;
    }
    Status setStatus(std::int64_t, const std::string&, const std::string&, const std::string&, XmlNode& root) override {
        ++calls;
        root.text = "1";
        return std::nullopt;
    }
    Status uploadPhoto(std::int64_t viewer, const std::string& aid, const std::string& caption,
                       const std::string& imageBytes, bool haveImage, XmlNode& root) override {
        ++calls;
        if (!haveImage || imageBytes.empty()) return ServiceError{324, "Missing or invalid image file"};
        root.add("pid", "7");
        root.add("aid", aid.empty() ? "app" : aid);
        root.add("owner", std::to_string(viewer));
        root.add("caption", caption);
        return std::nullopt;
    }
    Status usersGetInfo(std::int64_t, const std::string&, const std::string&, XmlNode&) override {
        ++calls;
        return std::nullopt;
    }
    Status friendsGet(std::int64_t, const std::string&, XmlNode&) override {
        ++calls;
        return std::nullopt;
    }
};

}  // namespace emu::test
