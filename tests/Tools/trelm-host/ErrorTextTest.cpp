// The words a user reads for each code the system defines, and how a chain is laid out.
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ErrorText.h"
#include "TerminalText.h"

namespace {

using trelm::uError;
using trelm::host::describeError;

TEST(ErrorTextTest, EveryCodeReadsInWordsWithWhatToDoWhereThereIsSomething) {
    struct Case {
        unsigned code;
        std::string words;
    };
    std::vector<Case> const cases = {
        {trelm::kFailure, "the operation failed [0x80000001]"},
        {trelm::kNotSupported, "this is not supported [0x80000002]"},
        {trelm::kNotSet, "a required setting is missing; add it to the configuration file [0x80000003]"},
        {trelm::kInvalid, "an argument or setting is not valid [0x80000004]"},
        {trelm::kNotFound, "not found [0x80000006]"},
        {trelm::kResource, "a system resource could not be had [0x80000008]"},
        {trelm::kInnerStep, "an inner step failed [0x80000009]"},
        {trelm::kOutOfMemory, "out of memory; free memory and try again [0x80000010]"},
        {trelm::kOutOfWindow, "outside the current window of rows [0x80000011]"},
        {trelm::kDataOpNotSupported, "the data source does not offer this operation [0x8000001b]"},
        {trelm::kNotSignedIn,
         "not signed in or the session expired; check facebook_source_login and facebook_source_password in the "
         "configuration file [0x8000001c]"},
        {trelm::kServiceError,
         "the service refused the request; the service's own code and text, where it gave them, say why [0x8000001d]"},
        {trelm::kRequestLimit, "the service's request limit was reached; wait a while and try again [0x8000001e]"},
        {trelm::kServiceUnavailable, "the service is unavailable; try again later [0x8000001f]"},
        {0x80000077, "an unknown failure [0x80000077]"},
    };
    for (Case const& c : cases) {
        EXPECT_EQ(describeError(TRELM_ERROR(c.code), false), c.words);
    }
}

TEST(ErrorTextTest, ChainsShowEachLevelWithItsTextAndTheRemedyOnlyWhereTheCauseIs) {
    uError const service = TRELM_ERROR_MSG(trelm::kServiceUnavailable, "service error 2: Service temporarily unavailable");
    uError const chain = TRELM_WRAP_MSG(trelm::kFailure, service, "facebook cannot list contacts");
    EXPECT_EQ(describeError(chain, false),
              "facebook cannot list contacts: the operation failed [0x80000001]\n"
              "  caused by: service error 2: Service temporarily unavailable: the service is unavailable; try "
              "again later [0x8000001f]");
    std::string const verbose = describeError(chain, true);
    EXPECT_NE(verbose.find("] at tests/Tools/trelm-host/ErrorTextTest:"), std::string::npos) << verbose;
    EXPECT_EQ(describeError(chain, false).find(" at tests/"), std::string::npos);
}

}  // namespace

// What the service, a plug-in or a user typed reaches a terminal without its control characters:
// an escape sequence in a status or an error text could otherwise recolour or clear the screen,
// and a line feed fake a line of output. Well-formed UTF-8 stays readable.
TEST(TerminalTextTest, ControlCharactersAndBrokenUtf8AreWrittenAsEscapes) {
    struct Case {
        std::string text, shown;
    };
    std::vector<Case> const cases = {
        {"Anna Moreau", "Anna Moreau"},
        {"Zo\xc3\xab \xe2\x82\xac \xf0\x9f\x98\x80", "Zo\xc3\xab \xe2\x82\xac \xf0\x9f\x98\x80"},
        {"\x1b[2Jcleared", "\\x1b[2Jcleared"},
        {"one\ntwo\r\tthree\x7f", "one\\ntwo\\r\\tthree\\x7f"},
        {"c1 \xc2\x9b" "31m", "c1 \\xc2\\x9b31m"},  // U+009B, the one-byte escape sequence start
        {"lone \x9b and cut \xe2\x82", "lone \\x9b and cut \\xe2\\x82"},
        {"overlong \xc0\xaf, surrogate \xed\xa0\x80", "overlong \\xc0\\xaf, surrogate \\xed\\xa0\\x80"},
        {std::string("nul\0end", 7), "nul\\x00end"},
    };
    for (Case const& c : cases) EXPECT_EQ(trelm::host::terminalText(c.text), c.shown) << c.text;
}
