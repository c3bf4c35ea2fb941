// Host, library and plug-in agree on every identity: each has one address in the process.

#include "plugin/identities.h"
#include "support/machine.h"

#include <gtest/gtest.h>
#include <ostream>

namespace {

using namespace identities;

const char* const kWayNames[] = {"at load", "by functions", "from values"};

void ExpectSame(const Table& expected, const Table& got, const char* module, Way way) {
    for (int i = 0; i < kIdentities; ++i)
        EXPECT_EQ(expected.rows[i], got.rows[i]) << kNames[i] << ", " << module << ", " << kWayNames[way];
}

TEST(Identity, IsOneAddressInHostLibraryAndPlugin) {
    const support::Plugin plugin("TAVOTestPlugin");
    const auto answer = plugin.Find<Answer>(kFunction);
    ASSERT_NE(answer, nullptr);
    const Table expected = Taken(AtLoad);
    for (const Way way : {AtLoad, ByInlineFunction, FromValues}) {
        ExpectSame(expected, Taken(way), "host", way);
        Table table = {};
        answer(way, &table);
        ExpectSame(expected, table, "plug-in", way);
    }
}

TEST(Identity, DiffersFromEveryOther) {
    const Table table = Taken(AtLoad);
    for (int i = 0; i < kIdentities; ++i) {
        EXPECT_NE(table.rows[i], nullptr) << kNames[i];
        for (int j = 0; j < i; ++j) EXPECT_NE(table.rows[i], table.rows[j]) << kNames[i] << ", " << kNames[j];
    }
}

TEST(Identity, OutlivesAPluginThatIsUnloaded) {
    const void* text;
    {
        const support::Plugin plugin("TAVOTestPlugin");
        const auto answer = plugin.Find<Answer>(kFunction);
        ASSERT_NE(answer, nullptr);
        Table table = {};
        answer(FromValues, &table);
        text = table.rows[TextInterned];
    }
    EXPECT_EQ(text, Text(g_interned));
    EXPECT_STREQ(L"interned by every module", g_interned);
}

} // namespace
