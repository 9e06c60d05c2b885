// The name cache, against a container that is slow and obvious.
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

#include <map>
#include <random>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/temp_dir.h"

namespace {

std::string folded(std::string name)
{
    for (char& c : name) {
        c = static_cast<char>(static_cast<signed char>(c) > 0x60 ? c - 0x20 : c);
    }
    return name;
}

// The hash of ELF symbol tables, step by step as it is usually told, over signed characters.
unsigned slow_slot(const std::string& name)
{
    std::uint32_t h = 0;
    for (const char c : name) {
        h = h * 16 + static_cast<std::uint32_t>(static_cast<signed char>(c));
        const std::uint32_t g = h & 0xf0000000;
        if (g != 0) {
            h = h ^ (g >> 24);
        }
        h = h & ~g;
    }
    return h % 7001;
}

// Names that often fold to the same key, of all bytes but 0.
std::string random_name(std::mt19937& random)
{
    std::string name(random() % 8, 'a');
    for (char& c : name) {
        c = random() % 4 != 0 ? "abABxX;9"[random() % 8] : static_cast<char>(random() % 255 + 1);
    }
    return name;
}

}  // namespace

TEST(LdcfHash, FindsWhatWasPutInLastUnderEverySpelling)
{
    std::mt19937 random(1);
    asyntaxinfo records[64] = {};
    std::map<std::string, asyntaxinfo*> expected;
    for (int i = 0; i < 20000; ++i) {
        const std::string name = random_name(random);
        if (random() % 16 == 0) {
            asyntaxinfo* record = &records[random() % 64];
            ldcf_hash_put(name.c_str(), record);
            expected[folded(name)] = record;
        }
        const ldcf_hash_tbl_entry* node = ldcf_hash_get(name.c_str());
        const auto known = expected.find(folded(name));
        ASSERT_EQ(node != nullptr, known != expected.end()) << name;
        if (node != nullptr) {
            ASSERT_EQ(node->info, known->second);
            ASSERT_EQ(node->name, known->first);
            ASSERT_EQ(static_cast<std::size_t>(node->length), known->first.size());
        }
        ASSERT_EQ(ldcf_hash_name(name.c_str()), slow_slot(name)) << name;
    }
    ldcf_hash_flush();
    for (const auto& entry : expected) {
        EXPECT_EQ(ldcf_hash_get(entry.first.c_str()), nullptr);
    }
}

TEST(LdcfHash, LongNamesAreLeftAlone)
{
    asyntaxinfo record = {};
    const std::string longest(1024, 'n');
    ldcf_hash_put(longest.c_str(), &record);
    ldcf_hash_put((longest + "n").c_str(), &record);
    ldcf_hash_put(nullptr, &record);
    EXPECT_NE(ldcf_hash_get(longest.c_str()), nullptr);
    EXPECT_EQ(ldcf_hash_get((longest + "n").c_str()), nullptr);
    EXPECT_EQ(ldcf_hash_get(nullptr), nullptr);
    EXPECT_EQ(ldcf_hash_name((longest + "n").c_str()), slow_slot(longest + "n"));
    ldcf_hash_flush();
}

TEST(LdcfHash, TheDumpShowsEverySlotWithItsChain)
{
    const test_support::temp_dir dir;
    asyntaxinfo record = {};
    for (const char* name : {"cn", "sn", "CN"}) {
        ldcf_hash_put(name, &record);
    }
    ldcf_debug_hash_tbl(dir.path("none/dump").c_str());  // can't be opened
    ldcf_debug_hash_tbl(dir.path("dump").c_str());
    const std::string dump = test_support::file_text(dir.path("dump"));
    EXPECT_TRUE(dump.starts_with("\tDump of Schema Hash Cache\nhashTable[ 0 ] = NULL\nhashTable[ 1 ] = NULL\n"));
    EXPECT_NE(dump.find("hashTable[ " + std::to_string(slow_slot("CN")) + " ] = ( CN ) ->( CN ) ->NULL\n"), dump.npos);
    EXPECT_TRUE(dump.ends_with("hashTable[ 7000 ] = NULL\n\nHash table size:\t\t7001\nHash table positions used:\t2\n"
                               "Number of elements:\t\t3\n"));
    ldcf_hash_flush();
}
