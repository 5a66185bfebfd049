#include <gtest/gtest.h>

#include <functional>

#include "FacebookLibrary.h"
#include "MessageParser.h"
#include "PhotoUploadParser.h"
#include "ThreadParser.h"

namespace trelm::test {
namespace {

using Thread = FacebookLibrary::ThreadObj;
using Message = FacebookLibrary::MessageObj;

uError parsePhoto(String const& xml) {
    String pid;
    return PhotoUploadParser(pid).parse(xml);
}
uError parseThreads(String const& xml) {
    Vector<Thread> threads;
    return ThreadParser(threads).parse(xml);
}
uError parseMessages(String const& xml) {
    Vector<Message> messages;
    return MessageParser(messages, "ctx").parse(xml);
}

// The three parsers share their handling of roots and error documents.
TEST(ResponseParsersTest, RootsAndErrorDocumentsGiveTheirCodes) {
    struct Case {
        char const* name;
        std::function<uError(String const&)> parse;
        char const* root;
    };
    Case const parsers[] = {
        {"photo", parsePhoto, "photos_upload_response"},
        {"threads", parseThreads, "mailbox_getInbox_response"},
        {"messages", parseMessages, "mailbox_getThreadMessages_response"},
    };
    struct Doc {
        char const* xml;  // "%" stands for the parser's own root
        unsigned code;
    };
    Doc const docs[] = {
        {"<%/>", kSuccess},
        {"<error_response><code>2</code></error_response>", kServiceUnavailable},
        {"<error_response><code>4</code></error_response>", kRequestLimit},
        {"<error_response><code>102</code></error_response>", kNotSignedIn},
        {"<error_response><code>321</code></error_response>", kServiceError},
        {"<error_response><code>x</code></error_response>", kFailure},
        {"<fql_query_response/>", kFailure},
        {"<%><unclosed></%>", kFailure},
        {"", kFailure},
    };
    for (Case const& p : parsers) {
        for (Doc const& d : docs) {
            std::string xml = d.xml;
            for (size_t at; (at = xml.find('%')) != std::string::npos;) xml.replace(at, 1, p.root);
            SCOPED_TRACE(std::string(p.name) + ": " + xml);
            EXPECT_EQ(p.parse(String(xml)).code(), d.code);
        }
    }
}

TEST(PhotoUploadParserTest, ReadsThePhotoIdOnly) {
    String pid;
    ASSERT_TRUE(PhotoUploadParser(pid)
                    .parse("<?xml version=\"1.0\"?><photos_upload_response xmlns=\"http://api.facebook.com/1.0/\">"
                           "<pid>100_7</pid><aid>100_1</aid><owner>100</owner><caption>c</caption>"
                           "</photos_upload_response>")
                    .ok());
    EXPECT_EQ(pid, "100_7");
}

TEST(ThreadParserTest, ReadsEachThreadAndIgnoresOtherChildren) {
    Vector<Thread> threads;
    ASSERT_TRUE(ThreadParser(threads)
                    .parse("<mailbox_getInbox_response>"
                           "<thread><tid>1</tid><subject>Hello &amp; bye</subject><last_update>1700000000"
                           "</last_update><unread>1</unread><message_count>4</message_count></thread>"
                           "<thread><tid>2</tid><subject></subject><last_update>12abc</last_update></thread>"
                           "<thread><tid>3</tid></thread>"
                           "</mailbox_getInbox_response>")
                    .ok());
    ASSERT_EQ(threads.size(), 3u);
    EXPECT_EQ(threads[0].threadId, "1");
    EXPECT_EQ(threads[0].subject, "Hello & bye");
    EXPECT_EQ(threads[0].lastUpdate, 1700000000);
    EXPECT_EQ(threads[1].subject, "");
    EXPECT_EQ(threads[1].lastUpdate, 12);  // atoi reads the leading number
    EXPECT_EQ(threads[2].lastUpdate, 0);
}

TEST(ThreadParserTest, RecordsBeforeABrokenAnswerStay) {
    Vector<Thread> threads{Thread{"old", "", 1}};
    EXPECT_EQ(ThreadParser(threads)
                  .parse("<mailbox_getInbox_response><thread><tid>1</tid></thread><thread><tid>2</ti")
                  .code(),
              kFailure);
    ASSERT_EQ(threads.size(), 3u);
    EXPECT_EQ(threads[0].threadId, "old");
    EXPECT_EQ(threads[1].threadId, "1");
}

TEST(MessageParserTest, ReadsEachMessageWithTheCallersContext) {
    Vector<Message> messages;
    ASSERT_TRUE(MessageParser(messages, "thread 9")
                    .parse("<mailbox_getThreadMessages_response>"
                           "<message><mid>9_1</mid><tid>9</tid><author>42</author><body>hi <b>bold</b>there</body>"
                           "<time_sent>1700000001</time_sent><has_attachment>false</has_attachment></message>"
                           "<message><mid>9_2</mid><tid>9</tid><author>43</author><body></body>"
                           "<time_sent>5</time_sent></message>"
                           "</mailbox_getThreadMessages_response>")
                    .ok());
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_EQ(messages[0].messageId, "9_1");
    EXPECT_EQ(messages[0].threadId, "9");
    EXPECT_EQ(messages[0].author, "42");
    EXPECT_EQ(messages[0].body, "hi there");  // text inside a child element is not the body's
    EXPECT_EQ(messages[0].timeSent, 1700000001);
    EXPECT_EQ(messages[0].context, "thread 9");
    EXPECT_EQ(messages[1].context, "thread 9");
    EXPECT_EQ(messages[1].timeSent, 5);
    EXPECT_FALSE(messages[1].hasAttachment);  // no has_attachment element
}

// The attachment flag follows the time-sent text read before "has_attachment" ends, never the
// element's own text. Other parts of the system depend on exactly this rule.
TEST(MessageParserTest, AttachmentFlagFollowsTheTimeSentReadSoFar) {
    struct Case {
        char const* message;
        bool flag;
    };
    Case const cases[] = {
        {"<time_sent>1700</time_sent><has_attachment>false</has_attachment>", true},
        {"<time_sent>0</time_sent><has_attachment>true</has_attachment>", false},
        {"<has_attachment>true</has_attachment><time_sent>1700</time_sent>", false},
        {"<time_sent></time_sent><has_attachment>true</has_attachment>", false},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.message);
        Vector<Message> messages;
        String xml = String("<mailbox_getThreadMessages_response><message><tid>1</tid>") + c.message +
                     "</message></mailbox_getThreadMessages_response>";
        ASSERT_TRUE(MessageParser(messages, "").parse(xml).ok());
        ASSERT_EQ(messages.size(), 1u);
        EXPECT_EQ(messages[0].hasAttachment, c.flag);
    }
}

// The time-sent text starts afresh with each message: an earlier message's time must not give a
// later one the flag.
TEST(MessageParserTest, TimeSentOfOneMessageDoesNotLeakIntoTheNext) {
    Vector<Message> messages;
    ASSERT_TRUE(MessageParser(messages, "")
                    .parse("<mailbox_getThreadMessages_response>"
                           "<message><time_sent>1700</time_sent></message>"
                           "<message><has_attachment>false</has_attachment><time_sent>1800</time_sent></message>"
                           "</mailbox_getThreadMessages_response>")
                    .ok());
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_FALSE(messages[1].hasAttachment);
    EXPECT_EQ(messages[1].timeSent, 1800);
}

}  // namespace
}  // namespace trelm::test
