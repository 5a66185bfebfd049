// The emulator driven the way clients of the service's own era drove it: hand-built multipart
// uploads, microtime call ids, JSON answers, texts that are not UTF-8, and large bodies. Every
// answer must be a well-formed document, and a request either succeeds or changes nothing.
#include <nlohmann/json.hpp>

#include <functional>

#include "EmulatorFixture.h"
#include "Utf8Text.h"

namespace emu::test {
namespace {

const std::string kJpeg = std::string("\xFF\xD8\xFF\xE0\x00\x10JFIF\x00", 11) + std::string(2000, '\x7F') + "\xFF\xD9";
const std::string kBoundary = "AaB03x-era";
const std::string kFffd = "\xEF\xBF\xBD";

// One multipart part: its Content-Disposition parameters and its content.
struct Part {
    std::string disposition;
    std::string content;
};

std::string multipart(Fields const& fields, std::vector<Part> const& extra) {
    std::string body;
    for (auto const& [key, value] : fields)
        body += "--" + kBoundary + "\r\nContent-Disposition: form-data; name=\"" + key + "\"\r\n\r\n" + value + "\r\n";
    for (Part const& p : extra)
        body += "--" + kBoundary + "\r\nContent-Disposition: form-data; " + p.disposition +
                "\r\nContent-Type: application/octet-stream\r\n\r\n" + p.content + "\r\n";
    return body + "--" + kBoundary + "--\r\n";
}

class FidelityTest : public EmulatorFixture {
public:
    Reply upload(Fields const& fields, std::vector<Part> const& files) {
        return client.postRaw(emulator->httpUrl(), "multipart/form-data; boundary=" + kBoundary, multipart(fields, files));
    }
    // The viewer's status message as a later FQL read shows it.
    std::string statusMessage() {
        const Reply r = client.postForm(
            emulator->httpUrl(), sessionCall("fql.query", {{"query", "SELECT status FROM user WHERE uid = me()"}}));
        EXPECT_TRUE(wellFormed(r.body)) << r.body.substr(0, 300);
        // Found by hand: a regular expression over a megabyte of text would overflow the stack.
        const std::size_t start = r.body.find("<message>");
        const std::size_t end = r.body.find("</message>");
        if (start == std::string::npos || end == std::string::npos) return {};
        return r.body.substr(start + 9, end - start - 9);
    }
};

TEST_F(FidelityTest, UploadsAreNeverSignedMustBeImagesAndKeepCaptionsCleaned) {
    struct Case {
        char const* name;
        std::vector<Part> files;
        Fields extra;  // signed arguments besides the call's own
        int code;
        std::size_t fileSize;
    };
    // How the body's parts are found is the request parser's unit test; here the store's answers.
    const std::string binaryName = "filename=\"\xFF\xFE.jpg\"";
    const std::vector<Case> cases = {
        {"binary file name, binary caption", {{binaryName, kJpeg}}, {{"caption", "caf\xE9 \x01"}}, 0, kJpeg.size()},
        {"a text file", {{"filename=\"notes.txt\"", "just some text, not a picture"}}, {}, 324, 29},
        {"an HTML page named .jpg", {{"filename=\"x.jpg\"", "<html><body>hi</body></html>"}}, {}, 324, 28},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        emulator->log().clear();
        Fields fields = c.extra;
        fields["caption"] += "from the era";
        const Reply r = upload(sessionCall("facebook.photos.upload", fields), c.files);
        ASSERT_EQ(r.code, CURLE_OK);
        EXPECT_EQ(r.status, 200);
        EXPECT_TRUE(wellFormed(r.body)) << r.body;
        EXPECT_EQ(r.errorCode(), c.code) << r.body;
        auto const logged = emulator->log().entries();
        ASSERT_EQ(logged.size(), 1u);
        EXPECT_EQ(logged[0].hadFile, !c.files.empty());
        EXPECT_EQ(logged[0].fileSize, c.fileSize);
        if (c.code == 0) {
            // The caption is kept as the service kept text: invalid bytes become U+FFFD.
            EXPECT_EQ(elementText(r.body, "caption"), Utf8Text::clean(fields["caption"]));
        }
    }
}

TEST_F(FidelityTest, ABrokenMultipartBodyIsAnsweredAsACallWithoutArguments) {
    const std::string body = multipart(fqlCall(), {});
    const Reply r = client.postRaw(emulator->httpUrl(), "multipart/form-data; boundary=" + kBoundary,
                                   body.substr(0, body.size() - 10));
    EXPECT_EQ(r.status, 200);
    EXPECT_TRUE(wellFormed(r.body)) << r.body;
    EXPECT_EQ(r.errorCode(), 101) << r.body;
}

// The answer writer is one for every method; these cases cover its shapes: a list, an empty list,
// an object of lists, a scalar, an object and an error document.
TEST_F(FidelityTest, FormatJsonAnswersInEveryShape) {
    using Json = nlohmann::json;
    struct Case {
        char const* name;
        std::function<Reply(std::string const& format)> send;
        std::function<void(Json const&)> check;
    };
    auto call = [this](std::string method, Fields fields) {
        return [this, method, fields](const std::string& format) {
            Fields f = fields;
            f["format"] = format;
            return client.postForm(emulator->httpUrl(), sessionCall(method, f));
        };
    };
    TestClient https;
    useHttps(https);
    const std::vector<Case> cases = {
        {"fql.query", call("facebook.fql.query", {{"query", "SELECT uid, name, status FROM user WHERE uid = me()"}}),
         [](Json const& j) {
             ASSERT_TRUE(j.is_array());
             ASSERT_EQ(j.size(), 1u);
             EXPECT_EQ(j[0]["uid"], std::to_string(DemoAccount::uid));
             EXPECT_TRUE(j[0]["name"].is_string());
         }},
        {"fql.query, no rows", call("fql.query", {{"query", "SELECT name FROM user WHERE uid = 1"}}),
         [](Json const& j) { EXPECT_EQ(j, Json::array()); }},
        {"stream.get", call("stream.get", {{"limit", "3"}}),
         [](Json const& j) {
             ASSERT_TRUE(j["posts"].is_array());
             EXPECT_EQ(j["posts"].size(), 3u);
             EXPECT_TRUE(j["posts"][0]["post_id"].is_string());
             EXPECT_TRUE(j["profiles"].is_array());
         }},
        {"users.setStatus", call("users.setStatus", {{"status", "json"}}), [](Json const& j) { EXPECT_EQ(j, "1"); }},
        {"auth.login",
         [&](std::string const& format) {
             return https.postForm(kHttpsUrl, appCall("facebook.auth.login", {{"email", DemoAccount::email},
                                                                              {"password", DemoAccount::password},
                                                                              {"format", format}}));
         },
         [](Json const& j) { EXPECT_EQ(j["secret"].get<std::string>().size(), 32u); }},
        {"an error, with the arguments as sent",
         [this](std::string const& format) {
             Fields f = sessionCall("fql.query", {{"query", "SELECT"}, {"format", format}});
             f["sig"] = "bad\xFF";
             return client.postForm(emulator->httpUrl(), f);
         },
         [](Json const& j) {
             EXPECT_EQ(j["error_code"], 104);
             EXPECT_EQ(j["error_msg"], "Incorrect signature");
             bool sawSig = false;
             for (const Json& a : j["request_args"])
                 if (a["key"] == "sig") sawSig = a["value"] == "bad" + kFffd;
             EXPECT_TRUE(sawSig) << j.dump();
         }},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        for (const std::string format : {"JSON", "json"}) {
            const Reply r = c.send(format);
            ASSERT_EQ(r.code, CURLE_OK);
            EXPECT_EQ(r.status, 200);
            EXPECT_EQ(r.contentType, "application/json; charset=utf-8");
            ASSERT_TRUE(Json::accept(r.body)) << r.body;
            c.check(Json::parse(r.body));
        }
        // Any other format is the XML document.
        const Reply xml = c.send("php");
        EXPECT_EQ(xml.contentType, "text/xml; charset=utf-8");
        EXPECT_TRUE(wellFormed(xml.body)) << xml.body;
    }
}

TEST_F(FidelityTest, UsersGetInfoAnswersEveryDocumentedFieldAndRefusesUnknownNames) {
    const std::vector<std::string> documented = {
        "about_me", "activities", "affiliations", "birthday", "birthday_date", "books", "current_location",
        "education_history", "email", "email_hashes", "first_name", "has_added_app", "hometown_location", "hs_info",
        "interests", "is_app_user", "last_name", "locale", "meeting_for", "meeting_sex", "movies", "music", "name",
        "notes_count", "online_presence", "pic", "pic_big", "pic_small", "pic_square", "pic_with_logo", "political",
        "profile_blurb", "profile_update_time", "profile_url", "proxied_email", "quotes", "relationship_status",
        "religion", "sex", "significant_other_id", "status", "timezone", "tv", "username", "verified", "wall_count",
        "website", "work_history"};
    std::string all;
    for (std::string const& f : documented) all += (all.empty() ? "" : ",") + f;
    const std::string me = std::to_string(DemoAccount::uid);

    struct Case {
        char const* name;
        std::string fields;
        int code;
    };
    const std::vector<Case> cases = {
        {"every documented field", all, 0},
        {"names in any case, with blanks", "TimeZone, username ,Online_Presence", 0},
        {"an unknown name", "name,shoe_size", 100},
        {"a table's column that is no user field", "name,uid2", 100},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        const Reply r =
            client.postForm(emulator->httpUrl(), sessionCall("users.getInfo", {{"uids", me}, {"fields", c.fields}}));
        EXPECT_TRUE(wellFormed(r.body)) << r.body;
        EXPECT_EQ(r.errorCode(), c.code) << r.body;
    }
    const Reply r = client.postForm(emulator->httpUrl(), sessionCall("users.getInfo", {{"uids", me}, {"fields", all}}));
    for (std::string const& f : documented)
        EXPECT_TRUE(r.body.find("<" + f + ">") != std::string::npos || r.body.find("<" + f + "/>") != std::string::npos)
            << f;
    for (char const* empty : {"timezone", "username", "online_presence", "email", "hometown_location"})
        EXPECT_NE(r.body.find("<" + std::string(empty) + "/>"), std::string::npos) << empty;
}

TEST_F(FidelityTest, TextThatIsNotUtf8IsKeptWithReplacementCharactersAndEveryAnswerStaysWellFormed) {
    struct Case {
        char const* name;
        std::string status;
    };
    const std::vector<Case> cases = {
        {"Latin-1", "caf\xE9 cr\xE8me"},
        {"control characters and NUL", std::string("a\0b\x01\x1B[31m", 9)},
        {"a cut UTF-8 sequence", "snow \xE2\x98"},
        {"binary", std::string("\x89PNG\r\n\x1A\n\0\0\0\rIHDR", 16)},
        {"valid UTF-8 stays as it is", "caf\xC3\xA9 \xE2\x98\x95 <b>&amp;</b>"},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        emulator->log().clear();
        for (const std::string format : {"XML", "JSON"}) {
            const Reply r = client.postForm(emulator->httpUrl(),
                                            sessionCall("users.setStatus", {{"status", c.status}, {"format", format}}));
            EXPECT_EQ(r.status, 200);
            if (format == "XML") {
                EXPECT_TRUE(wellFormed(r.body)) << r.body;
                EXPECT_EQ(r.errorCode(), 0) << r.body;
            } else {
                EXPECT_EQ(r.body, "\"1\"");
            }
        }
        EXPECT_EQ(emulator->log().entries().size(), 2u);
        // The stored text is the cleaned one, and later reads answer it well-formed.
        const std::string shown = statusMessage();
        std::string expected;
        Utf8Text::appendXml(expected, c.status);
        EXPECT_EQ(shown, expected);

        // An error document echoes the bytes as sent, cleaned the same way.
        Fields bad = sessionCall("users.setStatus", {{"status", c.status}});
        bad["sig"] = "0";
        const Reply error = client.postForm(emulator->httpUrl(), bad);
        EXPECT_TRUE(wellFormed(error.body)) << error.body;
        EXPECT_EQ(error.errorCode(), 104);
    }
}

TEST_F(FidelityTest, LargeBodiesUpToTheLimitAreServedAndLargerOnesGetAnErrorDocument) {
    // FQL with a long id list: far beyond the 8 KB that url-encoded forms were once cut at.
    std::string ids = std::to_string(DemoAccount::uid);
    for (int i = 0; i < 3000; ++i) ids += "," + std::to_string(900000000 + i);
    const Reply longQuery = client.postForm(
        emulator->httpUrl(), sessionCall("fql.query", {{"query", "SELECT name FROM user WHERE uid IN (" + ids + ")"}}));
    EXPECT_EQ(longQuery.errorCode(), 0) << longQuery.body.substr(0, 300);
    EXPECT_NE(longQuery.body.find("<name>"), std::string::npos);

    // A 1 MB status is kept whole.
    std::string status(1 << 20, 'x');
    for (std::size_t i = 0; i < status.size(); i += 100) status[i] = ' ';
    const Reply setStatus = client.postForm(emulator->httpUrl(), sessionCall("users.setStatus", {{"status", status}}));
    EXPECT_EQ(setStatus.errorCode(), 0) << setStatus.body.substr(0, 300);
    EXPECT_EQ(statusMessage(), status);

    // A 5 MB photo.
    const std::string photo = kJpeg + std::string(5 << 20, '\x42');
    emulator->log().clear();
    const Reply uploaded = upload(sessionCall("photos.upload"), {{"filename=\"big.jpg\"", photo}});
    EXPECT_EQ(uploaded.errorCode(), 0) << uploaded.body.substr(0, 300);
    ASSERT_EQ(emulator->log().entries().size(), 1u);
    EXPECT_EQ(emulator->log().entries()[0].fileSize, photo.size());

    // Over the limit: the body is ignored, so the call has no api_key; the connection still serves.
    const Reply tooLarge =
        client.postForm(emulator->httpUrl(), sessionCall("users.setStatus", {{"status", std::string(17 << 20, 'y')}}));
    ASSERT_EQ(tooLarge.code, CURLE_OK);
    EXPECT_EQ(tooLarge.status, 200);
    EXPECT_TRUE(wellFormed(tooLarge.body)) << tooLarge.body;
    EXPECT_EQ(tooLarge.errorCode(), 101) << tooLarge.body;
    EXPECT_EQ(statusMessage(), status);
    EXPECT_EQ(client.postForm(emulator->httpUrl(), fqlCall()).errorCode(), 0);
}

TEST_F(FidelityTest, LiteralSelectionsAnswerOneRowPerMatchLikeAnyOther) {
    // The client counts with "SELECT '' ..."; rows of literals are counted, not read.
    const std::string friends = " from user where uid in (select uid2 from friend where uid1 = me())";
    struct Case {
        std::string items, rest, row;
    };
    const std::vector<Case> cases = {
        {"''", friends, "<user><anon/></user>"},
        {"'x', 7", friends + " limit 2, 3", "<user><anon>x</anon><anon>7</anon></user>"},
        {"'<&>'", friends + " order by name desc limit 4 offset 3", "<user><anon>&lt;&amp;&gt;</anon></user>"},
        {"''", friends + " and uid < 0", "<user><anon/></user>"},
        {"1", " from user where uid = me()", "<user><anon>1</anon></user>"},
    };
    auto rows = [](std::string const& body, std::string const& row) {
        std::size_t n = 0;
        for (std::size_t at = body.find(row); at != std::string::npos; at = body.find(row, at + 1)) ++n;
        return n;
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.items + c.rest);
        const Reply literal =
            client.postForm(emulator->httpUrl(), sessionCall("fql.query", {{"query", "select " + c.items + c.rest}}));
        const Reply column =
            client.postForm(emulator->httpUrl(), sessionCall("fql.query", {{"query", "select uid" + c.rest}}));
        ASSERT_EQ(literal.errorCode(), 0) << literal.body;
        EXPECT_TRUE(wellFormed(literal.body)) << literal.body;
        EXPECT_EQ(rows(literal.body, "<user>"), rows(column.body, "<user>")) << literal.body << column.body;
        EXPECT_EQ(rows(literal.body, c.row), rows(column.body, "<user>")) << literal.body;
    }
}

}  // namespace
}  // namespace emu::test
