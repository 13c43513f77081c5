/** What the tests of items have in common, whatever service they come from. */
#ifndef ZYROVFS_TESTS_ITEM_FIXTURE_H
#define ZYROVFS_TESTS_ITEM_FIXTURE_H

#include <gmock/gmock.h>

#include <initializer_list>
#include <string>

#include "bridge/gvfs_flow_item.h"
#include "core/json.h"

namespace ZYROCloud::gvfs {

inline Json::Value Parsed(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(ZYROVFS::json::fromString(value, text)) << text;
    return value;
}

/** `convert(item, record)` takes the item with anything for each of its members, and anything for
 * the item. */
template <typename Convert>
void ExpectReadWithMembersOfAnyType(const Json::Value& item,
                                    std::initializer_list<const char*> members, Convert convert) {
    for (const char* value : {"null", "7", "1e300", "true", "[]", "[1]", "{}", R"({"id":{}})"}) {
        for (const char* member : members) {
            Json::Value odd = item;
            odd[member] = Parsed(value);
            ItemRecord record;
            EXPECT_TRUE(convert(odd, record)) << member << value;
        }
    }
    for (const char* none : {"7", "true", "\"text\"", "[]", "[{}]", "{}"}) {
        ItemRecord record;
        EXPECT_TRUE(convert(Parsed(none), record)) << none;
        EXPECT_EQ(record.id, "") << none;
    }
}

}  // namespace ZYROCloud::gvfs

#endif
