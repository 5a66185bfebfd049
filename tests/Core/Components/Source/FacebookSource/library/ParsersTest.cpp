#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <functional>

#include "MessageParser.h"
#include "PhotoUploadParser.h"
#include "ThreadParser.h"

namespace trelm::test {
namespace {

using Thread = FacebookLibrary::ThreadObj;
using Message = FacebookLibrary::MessageObj;

// The three parsers share their handling of roots and error documents (the translation of each
// service code: RequestTest.ServiceErrorsTranslateAndSessionErrorsDropTheSession).
TEST(ResponseParsersTest, RootsAndErrorDocumentsGiveTheirCodes) {
    struct Parser {
        std::function<uError(String const&)> parse;
        std::string root;
    } const parsers[] = {
        {[](String const& xml) { String pid; return PhotoUploadParser(pid).parse(xml); }, "photos_upload_response"},
        {[](String const& xml) { Vector<Thread> out; return ThreadParser(out).parse(xml); },
         "mailbox_getInbox_response"},
        {[](String const& xml) { Vector<Message> out; return MessageParser(out, "").parse(xml); },
         "mailbox_getThreadMessages_response"},
    };
    struct Doc {
        std::string xml;  // "@" stands for the parser's own root
        unsigned code;
    } const docs[] = {
        {"<@/>", kSuccess},
        {"<error_response><code>102</code></error_response>", kNotSignedIn},
        {"<error_response><code>x</code></error_response>", kFailure},
        {"<fql_query_response/>", kFailure},
        {"<@><unclosed></@>", kFailure},
        {"", kFailure},
    };
    for (Parser const& p : parsers) {
        for (Doc const& d : docs) {
            std::string xml = d.xml;
            for (size_t at; (at = xml.find('@')) != std::string::npos;) xml.replace(at, 1, p.root);
            EXPECT_CODE(p.parse(String(xml)), d.code) << xml;
        }
    }
}

// The flag follows the time-sent text read before "has_attachment" ends (starting afresh with each
// message), never the element's own text. Readers of these records depend on exactly this rule.
TEST(ResponseParsersTest, AttachmentFlagFollowsTheTimeSentReadSoFar) {
    struct Case {
        char const* message;
        bool flag;
    } const cases[] = {
        {"<time_sent>1700</time_sent><has_attachment>false</has_attachment>", true},
        {"<time_sent>0</time_sent><has_attachment>true</has_attachment>", false},
        {"<has_attachment>true</has_attachment><time_sent>1700</time_sent>", false},
        {"<time_sent>1700</time_sent>", false},
    };
    for (Case const& c : cases) {
        Vector<Message> messages;
        String xml = String("<mailbox_getThreadMessages_response><message><time_sent>5</time_sent></message>"
                            "<message>") + c.message + "</message></mailbox_getThreadMessages_response>";
        ASSERT_OK(MessageParser(messages, "").parse(xml));
        ASSERT_EQ(messages.size(), 2u);
        EXPECT_EQ(messages[1].hasAttachment, c.flag) << c.message;
    }
}

}  // namespace
}  // namespace trelm::test
