// Making and releasing entries, and their values one by one.
#include "servers/vrnd/libdirbase/model/entry.h"

#include <cstring>

#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using model_test::test_entry;
using model_test::value_list;

namespace {

class Entries : public model_test::Model {};

TEST_F(Entries, OnlyACacheReleasesWhatIsInIt)
{
    Entry* entry = nullptr;
    ASSERT_EQ(CreateEntry(&entry), 0);
    const Entry zeroed = {};
    EXPECT_EQ(std::memcmp(entry, &zeroed, sizeof zeroed), 0);
    EXPECT_NE(CreateEntry(nullptr), 0);
    for (char** text : {&entry->e_dn, &entry->e_norm_dn, &entry->e_checksum, &entry->e_checksumop}) {
        *text = strdup("cn=a");
    }
    for (berval**& values : entry->e_backend_values) {
        values = static_cast<berval**>(std::calloc(2, sizeof(berval*)));
        values[0] = ber_bvdup(*value_list({"x"}).get());
    }
    ASSERT_EQ(attr_merge(entry, "cn", value_list({"a", "b"}).get(), 1, 1, nullptr), 0);
    entry->e_id = 5;
    entry->e_flag = ENTRY_IN_CACHE | ENTRY_MEMBER_TRIMMED;
    const test_support::debug_catcher log;
    entry_free(entry);
    EXPECT_TRUE(log.has("Cannot free ENTRY_IN_CACHE: eid = 5, e_flag = 0x3, dn: cn=a\n"));
    EXPECT_STREQ(entry->e_dn, "cn=a");
    entry->e_flag = 0;
    entry_free(entry);  // LeakSanitizer tells whether all went
    entry_free(nullptr);
}

TEST_F(Entries, AValueIsFoundByItsSyntax)
{
    test_entry entry;
    entry.merge("objectClass", {"top", "2.5.6.6"});
    entry.merge("member", {"cn=a, cn=b"});
    entry.merge("cn", {"\xc3\xa4"}, 0, 0);
    entry.merge("description", {"\xc3\xa4"});
    struct {
        const char* name;
        const char* value;
        bool found;
    } const table[] = {
        {"objectclass", "TOP", true}, {"objectclass", "to", false},      {"member", "CN=A,2.5.4.3=B", true},
        {"member", "cn=a", false},    {"member", "no dn", false},        {"cn", "\xc3\xa4", true},
        {"cn", "\xc3\x84", false},    {"description", "\xc3\x84", true}, {"sn", "a", false},
    };
    for (const auto& row : table) {
        EXPECT_EQ(verify_attribute(&entry, row.name, row.value, std::strlen(row.value)), row.found)
            << row.name << " " << row.value;
    }
    EXPECT_FALSE(verify_attribute(nullptr, "cn", "a", 1) || verify_attribute(&entry, nullptr, "a", 1) ||
                 verify_attribute(&entry, "cn", nullptr, 0));
}

TEST_F(Entries, ValuesAreDeletedOneByOneAndTheRestStays)
{
    struct {
        const char* name;
        std::vector<std::string> values;
        int result;
        const char* left;
    } const table[] = {
        {"cn", {"A", "x", "b"}, 16, "b|c|B"}, {"cn", {"b", "b"}, 0, "a|c"},      {"cn", {"c", "b", "a", "B"}, 0, ""},
        {"sn", {"a"}, 16, "a|b|c|B"},         {"unknown", {"a"}, 16, "a|b|c|B"},
    };
    for (const auto& row : table) {
        test_entry entry;
        entry.merge("cn", {"a", "b", "c", "B"}, 0, 0);
        entry.merge("unknown", {"a"});
        LDAPMod mod = {};
        mod.mod_type = const_cast<char*>(row.name);
        const value_list values(row.values);
        mod.mod_bvalues = values.get();
        EXPECT_EQ(delete_values_from_entry(&entry, &mod), row.result);
        EXPECT_EQ(entry.values("cn"), row.left);
        EXPECT_EQ(entry.find("cn")->a_vals[entry.find("cn")->a_numvals], nullptr);
        mod.mod_bvalues = nullptr;
        EXPECT_EQ(delete_values_from_entry(&entry, &mod), *row.name == 'c' ? 0 : 16);
        EXPECT_EQ(entry.find("cn") == nullptr, *row.name == 'c');
    }
    test_entry entry;
    entry.merge("twoWay", {"a", "b"}, 0, 0);
    Attribute* attr = entry.find("twoWay");
    ASSERT_EQ(attr_create_decodedvals(attr), 0);
    const value_list value({"a"});
    LDAPMod mod = {};
    mod.mod_type = attr->a_type;
    mod.mod_bvalues = value.get();
    EXPECT_EQ(delete_values_from_entry(&entry, &mod), 0);
    EXPECT_EQ(attr->a_decoded, nullptr) << "it would still hold the value";
    EXPECT_EQ(delete_values_from_entry(nullptr, &mod), 16);
}

}  // namespace
