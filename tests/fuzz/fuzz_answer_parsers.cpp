// The plug-in reads what the network sends: every answer parse object and answer parser gets the
// same bytes. None may crash, hang or read out of bounds; each either reads the document or
// returns an error.
#include <cstddef>
#include <cstdint>

#include "MessageParser.h"
#include "PhotoUploadParser.h"
#include "ThreadParser.h"
#include "trelm/FStreamParseObj.h"
#include "trelm/FlatParseObj.h"
#include "trelm/FqlParseObj.h"
#include "trelm/HashParseObj.h"
#include "trelm/ListHashParseObj.h"
#include "trelm/ListParseObj.h"

using namespace trelm;

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    const String xml(std::string(reinterpret_cast<char const*>(data), size));
    // Results are dropped on purpose: a refused document is an expected outcome here.
    {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        FqlParseObj("fql_query_response", "user", 1).parse(xml, rows, count).ignore();
        FqlParseObj("fql_query_response", "", 0).parse(xml, rows, count).ignore();
        FStreamParseObj().parse(xml, rows, count).ignore();
        ListHashParseObj("mailbox_getInbox_response").parse(xml, rows).ignore();
    }
    {
        Map<String, String> hash;
        HashParseObj("auth_login_response").parse(xml, hash).ignore();
        HashParseObj("error_response").parse(xml, hash).ignore();
        String flat;
        FlatParseObj("users_setStatus_response").parse(xml, flat).ignore();
        Vector<String> list;
        ListParseObj("friends_get_response").parse(xml, list).ignore();
    }
    {
        String photoId;
        PhotoUploadParser(photoId).parse(xml).ignore();
        Vector<FacebookLibrary::ThreadObj> threads;
        ThreadParser(threads).parse(xml).ignore();
        Vector<FacebookLibrary::MessageObj> messages;
        MessageParser(messages, "fuzz").parse(xml).ignore();
    }
    return 0;
}
