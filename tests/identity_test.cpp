// Host, library and plug-in agree on every identity: each has one address in the process.

#include "plugin/identities.h"
#include "support/machine.h"

#include <gtest/gtest.h>

using namespace identities;

TEST(Identity, IsOneAddressInHostLibraryAndPlugin) {
    const support::Plugin plugin("TAVOTestPlugin");
    const auto answer = plugin.Find<Answer>(kFunction);
    ASSERT_NE(answer, nullptr);
    const Table expected = Taken(AtLoad);
    for (const Way way : {AtLoad, FromValues}) {
        const Table host = Taken(way);
        Table other = {};
        answer(way, &other);
        for (int i = 0; i < kIdentities; ++i) {
            EXPECT_EQ(host.rows[i], expected.rows[i]) << kNames[i] << ", host, way " << way;
            EXPECT_EQ(other.rows[i], expected.rows[i]) << kNames[i] << ", plug-in, way " << way;
        }
    }
}

TEST(Identity, DiffersFromEveryOther) {
    const Table table = Taken(AtLoad);
    for (int i = 0; i < kIdentities; ++i) {
        EXPECT_NE(table.rows[i], nullptr) << kNames[i];
        for (int j = 0; j < i; ++j) EXPECT_NE(table.rows[i], table.rows[j]) << kNames[i] << ", " << kNames[j];
    }
}
