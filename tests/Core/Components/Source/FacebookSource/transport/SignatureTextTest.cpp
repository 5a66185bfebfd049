// The signature hashes the pieces of a call through a fixed buffer: whatever the sizes of the
// values, and wherever they cross the buffer's end, it must be the MD5 of the whole text.
#include <gtest/gtest.h>

#include <string>

#include "ErrorAssertions.h"
#include "ServiceTransport.h"
#include "trelm/MD5.h"

namespace trelm::test {
namespace {

TEST(SignatureTextTest, LongValuesAnywhereAcrossTheBufferSignAsTheWholeText) {
    unsigned const querySizes[] = {0, 1, 1000, 1015, 1016, 1017, 1023, 1024, 1025, 2049, 5000};
    unsigned const leadSizes[] = {0, 7, 1013};  // "aid" sorts before "query": it moves the crossing
    String const secret("9e8d7c6b5a4f3e2d1c0b9a8f7e6d5c4b");
    for (unsigned lead : leadSizes) {
        for (unsigned size : querySizes) {
            Map<String, String> args;
            ASSERT_OK(ServiceTransport::makeBaseArgs("facebook.fql.query", args));
            ASSERT_OK(args.insert("aid", String(std::string(lead, 'a'))));
            ASSERT_OK(args.insert("query", String(std::string(size, 'q'))));
            String text;
            for (auto const& [key, value] : args) text += key + "=" + value;
            text += secret;
            EXPECT_EQ(ServiceTransport::signature(args, secret), md5Hex(text)) << lead << " " << size;
        }
    }
}

}  // namespace
}  // namespace trelm::test
