#include <functional>

#include "LibraryFixture.h"

namespace trelm::test {
namespace {

class ServiceCallsTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        signIn();
        ASSERT_OK(photo->setUri("/tmp/p.jpg"));
    }
    SmartPtr<InputDataStream> photo = makeSmart<InputDataStream>();
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    Vector<FacebookLibrary::ThreadObj> threads;
    Vector<FacebookLibrary::MessageObj> messages;
    String pid;
};

// What each call puts on the wire beside the authentication fields, and that it needs a session.
TEST_F(ServiceCallsTest, EachCallSendsItsMethodAndFields) {
    struct Case {
        std::function<uError()> call;
        Fields fields;
        bool upload;
    } const cases[] = {
        {[&] { return lib->runFqlQuery("SELECT uid FROM user WHERE uid=1", "user", rows, 0, count); },
         {{"method", "facebook.fql.query"}, {"query", "SELECT uid FROM user WHERE uid=1"}}, false},
        {[&] { return lib->runFStreamQuery("42", 100, 4294967295u, 25, rows, count); },
         {{"end_time", "4294967295"}, {"limit", "25"}, {"method", "facebook.stream.get"}, {"start_time", "100"},
          {"viewer_id", "42"}}, false},
        {[&] { return lib->getInboxThreads(40, 20, threads); },
         {{"limit", "20"}, {"method", "mailbox.getInbox"}, {"start", "40"}}, false},
        {[&] { return lib->getThreadMessages("t9", "ctx", 0, 50, messages); },
         {{"limit", "50"}, {"method", "mailbox.getThreadMessages"}, {"start", "0"}, {"tid", "t9"}}, false},
        {[&] { return lib->setStatus("is here", true); },
         {{"method", "users.setStatus"}, {"status", "is here"}, {"status_includes_verb", "1"}}, false},
        {[&] { return lib->setStatus("here", false); },
         {{"method", "users.setStatus"}, {"status", "here"}, {"status_includes_verb", "0"}}, false},
        {[&] { return lib->sendPhoto(photo, "a1", "cap", pid); },
         {{"aid", "a1"}, {"caption", "cap"}, {"method", "photos.upload"}}, true},
        {[&] { return lib->sendPhoto(photo, "", "", pid); }, {{"method", "photos.upload"}}, true},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.fields[0].second + "/" + c.fields.back().second);
        http.clear();
        c.call().ignore();  // the default answer is empty: only the request is checked here
        auto sent = http.exchanges();
        ASSERT_EQ(sent.size(), 1u);
        EXPECT_EQ(sent[0].url, "http://api.facebook.com/restserver.php");
        Fields own;
        for (auto const& [key, value] : entries(sent[0].fields)) {
            if (key != "api_key" && key != "session_key" && key != "call_id" && key != "sig" && key != "v") {
                own.emplace_back(key, value);
            }
        }
        EXPECT_EQ(own, c.fields);
        EXPECT_TRUE(sent[0].fields.contains("session_key"));
        EXPECT_EQ(sent[0].upload == photo, c.upload);
    }

    ASSERT_OK(info->invalidateSessionConfigWithoutUser(false));
    http.clear();
    for (Case const& c : cases) EXPECT_CODE(c.call(), kNotSignedIn);
    EXPECT_TRUE(http.exchanges().empty());
}

TEST_F(ServiceCallsTest, StatusAnswerOfZeroIsAFailure) {
    struct Case {
        char const* body;
        unsigned code;
    } const cases[] = {
        {"<users_setStatus_response>1</users_setStatus_response>", kSuccess},
        {"<users_setStatus_response>0</users_setStatus_response>", kFailure},
        {"<users_setStatus_response></users_setStatus_response>", kFailure},
        {"<other_response>1</other_response>", kFailure},
    };
    for (Case const& c : cases) {
        http.queue(String(c.body));
        EXPECT_CODE(lib->setStatus("s", false), c.code) << c.body;
    }
}

TEST_F(ServiceCallsTest, AnswersReachTheCaller) {
    http.queue(String("<fql_query_response list=\"true\"><user><uid>1</uid></user><user><uid>2</uid></user>"
                      "</fql_query_response>"));
    ASSERT_OK(lib->runFqlQuery("q", "user", rows, 1, count));
    EXPECT_EQ(count, 2u);
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(*rows[0].search("uid"), "2");

    http.queue(String("<photos_upload_response><pid>100_5</pid><aid>100_1</aid></photos_upload_response>"));
    pid = "stale";
    ASSERT_OK(lib->sendPhoto(photo, "", "", pid));
    EXPECT_EQ(pid, "100_5");
}

}  // namespace
}  // namespace trelm::test
