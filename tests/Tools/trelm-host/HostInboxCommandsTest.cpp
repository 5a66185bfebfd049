// trelm-host listing inbox messages and friend requests with the demo configuration, checked
// against the emulator's data.
#include <algorithm>
#include <set>
#include <string>
#include <vector>

#include "EmulatedHost.h"

using nlohmann::json;
using emu::test::Row;

namespace {

emu::Emulator::Options inboxOptions() {
    emu::Emulator::Options options;
    options.generator.users = 600;
    options.generator.friendRequests = 180;  // more than one page of 150
    options.generator.threadsPerUser = 12;
    options.generator.messagesPerThread = 7;
    return options;
}

TEST(HostInboxCommandsTest, MessagesNewestFirstAndEveryFriendRequestOnceWithNames) {
    EmulatedHost host(inboxOptions());
    std::vector<json> messages = host.records({"query", "messages", "--limit", "5"});
    std::vector<Row> inbox = host.fql("select message_id, thread_id, author_id, body, created_time from message where "
                                      "thread_id in (select thread_id from thread where folder_id = 0)");
    std::sort(inbox.begin(), inbox.end(), [](Row& a, Row& b) {
        return std::make_pair(std::stoi(b["created_time"]), b["message_id"]) <
               std::make_pair(std::stoi(a["created_time"]), a["message_id"]);
    });
    ASSERT_EQ(messages.size(), 5u);
    for (size_t i = 0; i < messages.size(); ++i) {
        Row& m = inbox[i];
        json const expected = {{"core_event_serviceid", m["thread_id"] + "-" + m["message_id"]},
                               {"core_object_time", std::stoi(m["created_time"])},
                               {"core_event_text", m["body"]},
                               {"core_event_contactid", m["author_id"]},
                               {"core_event_contactname", host.nameOf(m["author_id"])}};
        for (auto const& [key, value] : expected.items()) EXPECT_EQ(messages[i][key], value) << i << " " << key;
    }

    std::multiset<std::string> listed, pending;
    for (json const& f : host.records({"query", "friend-requests", "--all"})) {
        std::string const uid = f["core_event_contactid"];
        listed.insert(uid);
        EXPECT_EQ(f["core_event_serviceid"], "FriendRequest: " + uid);
        EXPECT_EQ(f["core_event_contactname"], host.nameOf(uid)) << uid;
    }
    for (Row& r : host.fql("select uid_from from friend_request where uid_to = me()")) pending.insert(r["uid_from"]);
    ASSERT_EQ(pending.size(), 180u);
    EXPECT_EQ(listed, pending) << "every requester exactly once";
}

}  // namespace
