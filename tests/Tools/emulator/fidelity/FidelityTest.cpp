// The emulator driven the way clients of the service's own era drove it: hand-built multipart
// uploads, JSON answers (texts that are not UTF-8 among them), and large bodies. Every
// answer must be a well-formed document, and a request either succeeds or changes nothing.
#include <nlohmann/json.hpp>

#include <functional>

#include "EmulatorFixture.h"
#include "Utf8Text.h"

namespace emu::test {
namespace {

const std::string kJpeg = std::string("\xFF\xD8\xFF\xE0\x00\x10JFIF\x00", 11) + std::string(2000, '\x7F') + "\xFF\xD9";
const std::string kFffd = "\xEF\xBF\xBD";

using FidelityTest = EmulatorFixture;

TEST_F(FidelityTest, UploadsAreNeverSignedMustBeImagesAndKeepCaptionsCleaned) {
    struct Case {
        char const* name;
        std::vector<FilePart> files;
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
        const Reply r =
            client.postMultipart(emulator->httpUrl(), sessionCall("facebook.photos.upload", fields), c.files);
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

// The answer writer is one for every method; these cases cover its shapes: a list, an empty list,
// a scalar and an error document.
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
        {"users.setStatus", call("users.setStatus", {{"status", "json"}}), [](Json const& j) { EXPECT_EQ(j, "1"); }},
        {"an error, with the arguments as sent (a byte that is not UTF-8 among them)",
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

TEST_F(FidelityTest, LargeBodiesUpToTheLimitAreServedAndUnreadableOnesGetAnErrorDocument) {
    // FQL with a long id list: far beyond the 8 KB that url-encoded forms were once cut at.
    std::string ids = std::to_string(DemoAccount::uid);
    for (int i = 0; i < 3000; ++i) ids += "," + std::to_string(900000000 + i);
    const Reply longQuery = client.postForm(
        emulator->httpUrl(), sessionCall("fql.query", {{"query", "SELECT name FROM user WHERE uid IN (" + ids + ")"}}));
    EXPECT_EQ(longQuery.errorCode(), 0) << longQuery.body.substr(0, 300);
    EXPECT_NE(longQuery.body.find("<name>"), std::string::npos);

    // A body over the limit or a broken multipart one is ignored, so the call has no api_key; the
    // connection still serves.
    const std::string broken = multipart(fqlCall(), {});
    for (Reply const& r :
         {client.postForm(emulator->httpUrl(),
                          sessionCall("users.setStatus", {{"status", std::string(17 << 20, 'y')}})),
          client.postRaw(emulator->httpUrl(), std::string("multipart/form-data; boundary=") + kBoundary,
                         broken.substr(0, broken.size() - 10))}) {
        ASSERT_EQ(r.code, CURLE_OK);
        EXPECT_EQ(r.status, 200);
        EXPECT_TRUE(wellFormed(r.body)) << r.body;
        EXPECT_EQ(r.errorCode(), 101) << r.body;
    }
    EXPECT_EQ(client.postForm(emulator->httpUrl(), fqlCall()).errorCode(), 0);
}

}  // namespace
}  // namespace emu::test
