// Which calls publish: those are sent on a new connection (see HttpRequest::setPublishing), so
// that a status or a photo never goes out twice without the user knowing.
#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "ServiceTransport.h"

namespace trelm {
namespace {

TEST(PublishingCallTest, StatusPostsAndUploadsPublishReadsDoNot) {
    struct Case {
        char const* method;  // null: no "method" field
        bool upload;
        bool publishing;
    } const cases[] = {
        {"users.setStatus", false, true},          {"facebook.users.setStatus", false, true},
        {"stream.publish", false, true},           {"facebook.stream.publish", false, true},
        {"photos.upload", true, true},             {"photos.upload", false, true},
        {"anything", true, true},                  {"facebook.fql.query", false, false},
        {"stream.get", false, false},              {"facebook.auth.login", false, false},
        {"users.setStatusX", false, false},        {"facebookusers.setStatus", false, false},
        {nullptr, false, false},
    };
    for (Case const& c : cases) {
        Map<String, String> args;
        if (c.method != nullptr) {
            ASSERT_OK(args.insert("method", c.method));
        }
        EXPECT_EQ(ServiceTransport::isPublishing(args, c.upload), c.publishing)
            << (c.method ? c.method : "(no method)") << (c.upload ? " with upload" : "");
    }
}

}  // namespace
}  // namespace trelm
