#include <gtest/gtest.h>

#include <functional>

#include "LibraryFixture.h"

namespace trelm::test {
namespace {

using Fields = std::vector<std::pair<std::string, std::string>>;

class ServiceCallsTest : public LibraryFixture {
protected:
    void SetUp() override {
        LibraryFixture::SetUp();
        signIn();
    }
    // The fields a call sent, without the ones every session call carries.
    Fields callFields() {
        Fields out;
        for (auto const& [key, value] : lastFields()) {
            if (key != "api_key" && key != "session_key" && key != "call_id" && key != "sig" && key != "v") {
                out.emplace_back(key.str(), value.str());
            }
        }
        return out;
    }
};

// What each call puts on the wire, beside the authentication fields.
TEST_F(ServiceCallsTest, EachCallSendsItsMethodAndFields) {
    auto photo = makeSmart<InputDataStream>();
    ASSERT_TRUE(photo->setUri("/tmp/p.jpg").ok());
    struct Case {
        char const* name;
        std::function<uError(FacebookLibrary&)> call;
        Fields fields;
    };
    Case const cases[] = {
        {"fql",
         [](FacebookLibrary& l) {
             Vector<Map<String, String>> rows;
             unsigned count = 0;
             return l.runFqlQuery("SELECT uid FROM user WHERE uid=1", "user", rows, 0, count);
         },
         {{"method", "facebook.fql.query"}, {"query", "SELECT uid FROM user WHERE uid=1"}}},
        {"stream",
         [](FacebookLibrary& l) {
             Vector<Map<String, String>> rows;
             unsigned count = 0;
             return l.runFStreamQuery("42", 100, 4294967295u, 25, rows, count);
         },
         {{"end_time", "4294967295"},
          {"limit", "25"},
          {"method", "facebook.stream.get"},
          {"start_time", "100"},
          {"viewer_id", "42"}}},
        {"inbox",
         [](FacebookLibrary& l) {
             Vector<FacebookLibrary::ThreadObj> threads;
             return l.getInboxThreads(40, 20, threads);
         },
         {{"limit", "20"}, {"method", "mailbox.getInbox"}, {"start", "40"}}},
        {"thread messages",
         [](FacebookLibrary& l) {
             Vector<FacebookLibrary::MessageObj> messages;
             return l.getThreadMessages("t9", "ctx", 0, 50, messages);
         },
         {{"limit", "50"}, {"method", "mailbox.getThreadMessages"}, {"start", "0"}, {"tid", "t9"}}},
        {"status with verb", [](FacebookLibrary& l) { return l.setStatus("is here", true); },
         {{"method", "users.setStatus"}, {"status", "is here"}, {"status_includes_verb", "1"}}},
        {"status without verb", [](FacebookLibrary& l) { return l.setStatus("here", false); },
         {{"method", "users.setStatus"}, {"status", "here"}, {"status_includes_verb", "0"}}},
        {"photo with album and caption",
         [&](FacebookLibrary& l) {
             String pid;
             return l.sendPhoto(photo, "a1", "cap", pid);
         },
         {{"aid", "a1"}, {"caption", "cap"}, {"method", "photos.upload"}}},
        {"photo without album or caption",
         [&](FacebookLibrary& l) {
             String pid;
             return l.sendPhoto(photo, "", "", pid);
         },
         {{"method", "photos.upload"}}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        http.clear();
        c.call(*lib);  // the default answer is empty; only the request is checked here
        auto sent = http.exchanges();
        ASSERT_EQ(sent.size(), 1u);
        EXPECT_EQ(sent[0].url, "http://api.facebook.com/restserver.php");
        EXPECT_TRUE(sent[0].fields.contains("session_key"));
        EXPECT_EQ(callFields(), c.fields);
        EXPECT_EQ(bool(sent[0].upload), std::string(c.name).rfind("photo", 0) == 0);
    }
}

TEST_F(ServiceCallsTest, CallsWithoutSessionFailWithoutARequest) {
    ASSERT_TRUE(info->invalidateSessionConfigWithoutUser(false).ok());
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    Vector<FacebookLibrary::ThreadObj> threads;
    Vector<FacebookLibrary::MessageObj> messages;
    String pid;
    EXPECT_EQ(lib->runFqlQuery("q", "user", rows, 0, count).code(), kNotSignedIn);
    EXPECT_EQ(lib->runFStreamQuery("1", 0, 0, 0, rows, count).code(), kNotSignedIn);
    EXPECT_EQ(lib->getInboxThreads(0, 20, threads).code(), kNotSignedIn);
    EXPECT_EQ(lib->getThreadMessages("t", "c", 0, 50, messages).code(), kNotSignedIn);
    EXPECT_EQ(lib->setStatus("s", false).code(), kNotSignedIn);
    EXPECT_EQ(lib->sendPhoto(SmartPtr<InputDataStream>(), "", "", pid).code(), kNotSignedIn);
    EXPECT_TRUE(http.exchanges().empty());
}

TEST_F(ServiceCallsTest, FqlRowsAndCountComeFromTheAnswer) {
    http.queue(String(
        "<fql_query_response list=\"true\"><user><uid>1</uid><current_location><city>Oslo</city></current_location>"
        "</user><user><uid>2</uid><current_location/></user><user><uid>3</uid></user></fql_query_response>"));
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    ASSERT_TRUE(lib->runFqlQuery("q", "user", rows, 1, count).ok());
    EXPECT_EQ(count, 3u);
    ASSERT_EQ(rows.size(), 2u);
    EXPECT_EQ(*rows[0].search("uid"), "2");
    EXPECT_EQ(*rows[1].search("uid"), "3");
}

TEST_F(ServiceCallsTest, StreamRowsComeFromTheAnswer) {
    http.queue(String(
        "<stream_get_response><posts list=\"true\"><stream_post><post_id>1_2</post_id><source_id>1</source_id>"
        "<type>46</type><message>hello</message><created_time>77</created_time></stream_post></posts>"
        "<profiles list=\"true\"/></stream_get_response>"));
    Vector<Map<String, String>> rows;
    unsigned count = 0;
    ASSERT_TRUE(lib->runFStreamQuery("1", 0, 0, 10, rows, count).ok());
    EXPECT_EQ(count, 1u);
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(*rows[0].search("message"), "hello");
    EXPECT_TRUE(rows[0].contains("is_status"));
}

TEST_F(ServiceCallsTest, StatusAnswerOfZeroIsAFailure) {
    struct Case {
        char const* body;
        unsigned code;
    };
    Case const cases[] = {
        {"<users_setStatus_response>1</users_setStatus_response>", kSuccess},
        {"<users_setStatus_response>0</users_setStatus_response>", kFailure},
        {"<users_setStatus_response></users_setStatus_response>", kFailure},
        {"<other_response>1</other_response>", kFailure},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.body);
        http.queue(String(c.body));
        EXPECT_EQ(lib->setStatus("s", false).code(), c.code);
    }
}

TEST_F(ServiceCallsTest, PhotoIdComesFromTheUploadAnswer) {
    auto photo = makeSmart<InputDataStream>();
    ASSERT_TRUE(photo->setUri("/tmp/p.jpg").ok());
    http.queue(String("<photos_upload_response><pid>100_5</pid><aid>100_1</aid><owner>100</owner>"
                      "</photos_upload_response>"));
    String pid = "stale";
    ASSERT_TRUE(lib->sendPhoto(photo, "", "", pid).ok());
    EXPECT_EQ(pid, "100_5");
    EXPECT_EQ(http.exchanges().back().upload, SmartPtr<InputDataStream>(photo));
}

// An error answer reaches the caller as its code, whatever the call.
TEST_F(ServiceCallsTest, ServiceErrorsReachTheCaller) {
    http.setDefault({200, "<error_response><error_code>4</error_code></error_response>", {}});
    Vector<FacebookLibrary::ThreadObj> threads;
    Vector<FacebookLibrary::MessageObj> messages;
    String pid;
    EXPECT_EQ(lib->getInboxThreads(0, 20, threads).code(), kRequestLimit);
    EXPECT_EQ(lib->getThreadMessages("t", "c", 0, 50, messages).code(), kRequestLimit);
    EXPECT_EQ(lib->sendPhoto(SmartPtr<InputDataStream>(), "", "", pid).code(), kRequestLimit);
    EXPECT_TRUE(threads.empty());
}

}  // namespace
}  // namespace trelm::test
