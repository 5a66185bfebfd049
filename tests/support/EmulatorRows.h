#pragma once

// What the emulator's store holds, read with FQL as a given user, for tests that compare what a
// client got with the service's data:
//   auto rows = emu::test::fqlRows(emulator.store(), emu::DemoAccount::uid, "SELECT uid FROM ...");
// Each row maps a column to its text; nested columns also appear as "parent.child"; a nil value
// is absent. Only for tests that link the emulator.

#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "Store.h"

namespace emu::test {

using Row = std::map<std::string, std::string>;

inline std::vector<Row> fqlRows(Store& store, std::int64_t viewer, std::string const& query) {
    XmlNode root("fql_query_response");
    Status status = store.fqlQuery(viewer, query, root);
    EXPECT_FALSE(status.has_value()) << query << ": " << status->message;
    std::vector<Row> rows;
    for (XmlNode const& element : root.children) {
        Row row;
        for (XmlNode const& field : element.children) {
            if (!field.nil) row[field.name] = field.text;
            for (XmlNode const& part : field.children) {
                if (!part.nil) row[field.name + "." + part.name] = part.text;
            }
        }
        rows.push_back(row);
    }
    return rows;
}

}  // namespace emu::test
