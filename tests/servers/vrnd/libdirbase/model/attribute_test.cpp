// The attributes of an entry: their lists, versions and slots.
#include "servers/vrnd/libdirbase/model/attribute.h"

#include <algorithm>
#include <map>
#include <random>

#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/dn_expand.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using model_test::info_of;
using model_test::joined;
using model_test::test_entry;
using test_support::debug_catcher;

namespace {

class Attributes : public model_test::Model {};
class DnExpand : public model_test::Model {};

std::string in_order_of_names(Entry& entry)
{
    std::string names;
    const auto add = [](Attribute* attr, void* text) {
        *static_cast<std::string*>(text) += std::string(attr->a_type) + " ";
        return 0;
    };
    EXPECT_EQ(flatattr_apply(&entry, add, &names), -6);
    return names;
}

std::string in_order_of_arrival(const Entry& entry)
{
    std::string names;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        names += std::string(attr->a_type) + " ";
        EXPECT_EQ(attr->a_next == nullptr ? entry.e_attrs_tail : attr->a_next->a_prev, attr);
    }
    return names;
}

// The records that a name stands for, in the order of a walk.
std::string versions(const Entry& entry, const char* name, bool by_next_only)
{
    std::string found;
    int started = 0;
    int tag_state = -1;
    asyntaxinfo* info = by_next_only ? info_of(name) : nullptr;
    Attribute* attr = nullptr;
    const auto next = [&] { return attr_find_next_attr_match(&entry, name, &started, &tag_state, info, &attr); };
    if (by_next_only) {
        EXPECT_EQ(next(), 0);
    } else {
        EXPECT_EQ(attr_find_attr_or_lang_tag_version(&entry, name, &started, &tag_state, &info, &attr), 0);
    }
    while (attr != nullptr) {
        EXPECT_NE(started, 0);
        found += std::string(attr->a_type) + " ";
        EXPECT_EQ(next(), 0);
    }
    return found;
}

TEST_F(Attributes, NamesThatMeanOneVersionShareOneRecord)
{
    struct {
        const char* name;
        int result;
        const char* stored;  // the record that the value went to; null for a new one under the name given
    } const table[] = {
        {"CommonName", 0, nullptr},
        {"cn", 0, "CommonName"},
        {"2.5.4.3", 0, "CommonName"},
        {"cn;Lang-EN", 0, nullptr},
        {"CN;lang-en", 0, "cn;Lang-EN"},
        {"cn1", 0, nullptr},
        {"commonname;LANG-EN", 0, "cn;Lang-EN"},  // not hidden by cn1, which sorts between them
        {"2.5.4.3;lang-de", 0, "cn;lang-de"},
        {"oid.SURNAME", 0, "sn"},
        {"none;lang-en", 0, nullptr},
        {"NONE;LANG-en", 0, "none;lang-en"},
        {"none", 0, nullptr},
        {"1.2.3", 0, nullptr},
        {"cert;binary", 0, nullptr},
        {"cert", 0, "cert;binary"},
        {"cn;lang-", 21, nullptr},
        {"cn;lang-en-", 21, nullptr},
        {"cn;lang--a", 21, nullptr},
        {"cn;", 21, nullptr},
        {"cn;lang-e1", 21, nullptr},
        {"cn;lang-en-us1", 0, nullptr},
        {"objectclass", 0, nullptr},
        {"objectClass;lang-en", 0, nullptr},
    };
    test_entry entry;
    std::map<std::string, std::string> expected;  // values by record
    int value = 0;
    for (const auto& row : table) {
        const std::string text = std::to_string(value++);
        EXPECT_EQ(entry.merge(row.name, {text}), row.result) << row.name;
        if (row.result == 0) {
            std::string& values = expected[row.stored == nullptr ? row.name : row.stored];
            values += (values.empty() ? "" : "|") + text;
        }
    }
    std::map<std::string, std::string> found;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        EXPECT_TRUE(found.emplace(attr->a_type, joined(attr->a_vals)).second) << attr->a_type;
    }
    EXPECT_EQ(found, expected);
    EXPECT_EQ(entry.values("2.5.4.3;lang-de"), entry.values("cn;LANG-DE"));
    EXPECT_EQ(entry.values("none"), "(none)");  // the schema doesn't know it
    EXPECT_STREQ(entry.find("objectclass;lang-en")->a_type, "objectclass");

    const debug_catcher debug;
    const std::string longest = "cn;lang-" + std::string(235, 'x');
    EXPECT_EQ(entry.merge(longest.c_str(), {"a"}), 0);
    EXPECT_EQ(entry.merge((longest + "x").c_str(), {"a"}), 21);
    EXPECT_EQ(entry.merge("cn;x", {"a"}), 21);
    EXPECT_EQ(debug.texts().back(), "Error - attr_merge: invalid language tag.\n");
    EXPECT_TRUE(debug.has("Error - attr_merge: parse_language_tags() failed.\n"));
    EXPECT_EQ(attr_find(&entry, (longest + "x").c_str(), 0, info_of("cn")), nullptr);
    EXPECT_EQ(attr_merge(nullptr, "cn", nullptr, 0, 0, nullptr), 80);
}

TEST_F(Attributes, ListsKeepBothOrdersWhateverIsAddedAndDeleted)
{
    const std::vector<std::string> names = {
        "cn",         "cn;lang-en", "cn;lang-de",     "cn1",          "a",   "B",           "sn",         "Zoo",
        "zoo;lang-x", "member",     "member;lang-en", "uniqueMember", "ref", "ref;lang-en", "objectClass"};
    std::mt19937 random(3);
    test_entry entry;
    std::vector<std::string> arrived;
    for (int i = 0; i < 4000; ++i) {
        const std::string& name = names[random() % names.size()];
        const auto at = std::find(arrived.begin(), arrived.end(), name);
        const bool known = info_of(name.c_str()) != nullptr && name.find("ember;") == name.npos;
        if (at == arrived.end()) {
            ASSERT_EQ(entry.merge(name.c_str(), {"cn=x"}, 1, 0), 0);
            arrived.push_back(name);
        } else if (known) {
            ASSERT_EQ(attr_delete(&entry, name.c_str(), nullptr), 0) << name;
            arrived.erase(at);
            ASSERT_TRUE(name == "member" || attr_delete(&entry, name.c_str(), nullptr) == (arrived.empty() ? -1 : 1));
        }
        std::string expected;
        for (const std::string& other : arrived) {
            expected += other + " ";
        }
        ASSERT_EQ(in_order_of_arrival(entry), expected);
        const auto has = [&](const char* wanted) { return std::count(arrived.begin(), arrived.end(), wanted) != 0; };
        ASSERT_STREQ(entry.e_member_attr == nullptr ? "" : entry.e_member_attr->a_type,
                     has("member") ? "member" : (has("member;lang-en") ? "member;lang-en" : ""));
        ASSERT_EQ(entry.e_ref_attr != nullptr, has("ref"));
        ASSERT_EQ(entry.e_objectclass_attr != nullptr, has("objectClass"));
        std::vector<std::string> keys;
        for (const Attribute* attr = entry.e_sorted_low; attr != nullptr; attr = attr->a_sorted_next) {
            keys.emplace_back(attr->a_info != nullptr ? attr->a_info->names[0] : attr->a_type);
            attr_normalize(keys.back().data());
            ASSERT_EQ(attr->a_sorted_next == nullptr ? entry.e_sorted_high : attr->a_sorted_next->a_sorted_prev, attr);
        }
        ASSERT_TRUE(keys.size() == arrived.size() && std::is_sorted(keys.begin(), keys.end()));
    }
}

// The lists of an entry with very many attributes, by whose index records are found, against those of one whose index
// is taken away at every step.
TEST_F(Attributes, AnIndexChangesNothingButTheTime)
{
    std::vector<std::string> names = {"cn", "sn", "member", "ref", "objectClass", "description", "2.5.4.3", "SN"};
    for (std::size_t i = names.size(); i < 400; ++i) {
        names.push_back((i % 2 == 0 ? names[i % 6] + ";lang-" : "None") + static_cast<char>('a' + i % 26) +
                        static_cast<char>('A' + i / 26));
    }
    std::mt19937 random(5);
    test_entry indexed;
    test_entry plain;
    for (int i = 0; i < 6000; ++i) {
        const char* name = names[random() % names.size()].c_str();
        if (random() % 5 < 3) {
            ASSERT_EQ(indexed.merge(name, {"cn=x"}, 1, 0), 0) << name;
            plain.merge(name, {"cn=x"}, 1, 0);
        } else if (info_of(name) != nullptr) {
            ASSERT_EQ(attr_delete(&indexed, name, nullptr), attr_delete(&plain, name, nullptr)) << name;
        }
        delete std::exchange(plain.e_index, nullptr);
        const Attribute* found = indexed.find(name);
        const Attribute* expected = plain.find(name);
        ASSERT_STREQ(found == nullptr ? "" : found->a_type, expected == nullptr ? "" : expected->a_type);
        if (i % 50 == 0) {
            ASSERT_EQ(in_order_of_names(indexed), in_order_of_names(plain));
            ASSERT_EQ(in_order_of_arrival(indexed), in_order_of_arrival(plain));
        }
    }
    EXPECT_NE(indexed.e_index, nullptr);
}

TEST_F(Attributes, WalksAndCounts)
{
    test_entry entry;
    EXPECT_EQ(attr_delete(&entry, "cn", nullptr), -1);
    for (const char* name : {"B", "cn;lang-en", "c", "cn", "a", "cn;lang-de"}) {
        ASSERT_EQ(entry.merge(name, {"x"}), 0);
    }
    EXPECT_EQ(in_order_of_names(entry), "a B c cn;lang-de cn cn;lang-en ");
    EXPECT_EQ(flatattr_apply(
                  &entry, [](Attribute*, void*) { return -1; }, nullptr),
              1);
    EXPECT_EQ(versions(entry, "cn", false), "cn cn;lang-en cn;lang-de ");
    EXPECT_EQ(versions(entry, "commonName", true), "cn;lang-en cn cn;lang-de ");
    EXPECT_EQ(versions(entry, "cn;LANG-DE", false), "cn;lang-de ");
    EXPECT_EQ(versions(entry, "cn;lang-fr", false) + versions(entry, "cn;lang-de", true), "");
    EXPECT_EQ(versions(entry, "c", true), "");
    EXPECT_EQ(attr_delete(&entry, "cn", nullptr), 0);
    EXPECT_EQ(versions(entry, "cn", false), "cn;lang-en cn;lang-de ");
    EXPECT_EQ(versions(entry, "cn;x", false), "cn;lang-en cn;lang-de ");  // no valid tag
    int state = 0;
    EXPECT_EQ(attr_find_attr_or_lang_tag_version(&entry, "cn", nullptr, &state, nullptr, nullptr), 1);
    EXPECT_EQ(attr_find_next_attr_match(&entry, "cn", &state, &state, nullptr, nullptr), 1);

    ASSERT_EQ(entry.merge("member", {"cn=a"}), 0);
    ASSERT_EQ(entry.merge("uniqueMember", {"bad"}), 34);
    EXPECT_TRUE(entry.e_member_count == -1 && entry.e_uniquemember_count == -1);
    EXPECT_EQ(entry.values("uniqueMember"), "");                   // a record without values stays
    EXPECT_EQ(attr_delete(&entry, "member;lang-en", nullptr), 0);  // the slot's, whatever the tag
    const std::string too_long = ";" + std::string(241, 'x');
    EXPECT_EQ(attr_delete(&entry, ("cn" + too_long).c_str(), nullptr), 21);
    EXPECT_EQ(attr_delete(&entry, ("uniqueMember" + too_long).c_str(), info_of("uniqueMember")), 21);
    EXPECT_EQ(attr_delete(&entry, "uniqueMember", nullptr), 0);
    EXPECT_TRUE(entry.e_member_count == 0 && entry.e_uniquemember_count == 0);
    ASSERT_EQ(entry.merge("objectClass", {"top"}), 0);
    EXPECT_EQ(attr_delete(&entry, ("objectClass" + too_long).c_str(), info_of("objectClass")), 0);

    char wanted[] = "SN";
    char* list[] = {wanted, nullptr};
    EXPECT_TRUE(do_attr_merge(&entry, "sn", "v", list) == 0 && do_attr_merge(&entry, "description", "v", list) == 0);
    EXPECT_EQ(do_attr_merge(&entry, "sn", nullptr, nullptr), 0);
    EXPECT_EQ(entry.values("sn") + " " + entry.values("description"), "v| (none)");
    Attribute* attr = nullptr;
    EXPECT_EQ(flatattr_insert(&entry, nullptr, nullptr, &attr, nullptr), 80);
}

TEST_F(DnExpand, TheFirstRdnBecomesAttributes)
{
    struct {
        const char* dn;
        int plain_result;
        const char* plain;  // name=value of each attribute
        int esc_result;
        const char* esc;
    } const table[] = {
        {"cn = Bob Smith , sn=x", 0, "cn=Bob Smith;", 0, "cn=Bob Smith;"},
        {"sn=b+commonName=a\\,c,sn=x", 0, "sn=b;commonName=a,c;", 0, "cn=a,c;sn=b;"},
        {"cn=\"a,b+c\";sn=x", 0, "cn=a,b+c;", 0, "cn=a,b+c;"},
        {"2.5.4.3=a+cn=A+cn=b", 0, "cn=a|b;", 0, "cn=a|b;"},
        {"cn=a\\2Bb", 0, "cn=a2Bb;", 0, "cn=a+b;"},
        {"cn=+sn=b,sn=x", 0, "cn=;", 0, "cn=;sn=b;"},
        {"", -1, "", -1, ""},
        {"cn=a+none=b,sn=x", 80, "cn=a;", 80, ""},
        {"cn=a,none=b", 0, "cn=a;", 80, ""},
        {"cn=a+nothing", 34, "cn=a;", 34, ""},
        {"member=bad+number=x,sn=x", 34, "member=;", 21, "member=;number=;"},
    };
    for (const auto& row : table) {
        for (const auto expand : {expand_rdn, expand_rdn_esc}) {
            test_entry entry;
            std::string dn = row.dn;
            entry.e_dn = dn.data();
            const bool plain = expand == expand_rdn;
            EXPECT_EQ(expand(&entry), plain ? row.plain_result : row.esc_result) << row.dn;
            std::string found;
            for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
                found += std::string(attr->a_type) + "=" + joined(attr->a_vals) + ";";
            }
            EXPECT_EQ(found, plain ? row.plain : row.esc) << row.dn;
        }
    }
    EXPECT_TRUE(expand_rdn(nullptr) == -1 && expand_rdn_esc(nullptr) == -1);
}

// The keys of the index are texts of the records and of the schema.
TEST_F(Attributes, AnIndexSurvivesATypeThatBecomesKnown)
{
    test_entry entry;
    ASSERT_EQ(entry.merge("later", {"v"}), 0);
    for (int i = 199; i >= 100; --i) {
        ASSERT_EQ(entry.merge(("z" + std::to_string(i)).c_str(), {"v"}), 0);
    }
    ASSERT_NE(entry.e_index, nullptr);
    ldcf_schema_g->parse_str("attributeTypes { ( 9.77 NAME 'later' SYNTAX " ARC "15 ) }", "later");
    ldcf_schema_g->complete_nocheck();
    ASSERT_EQ(ldcf_api_schema_complete_db_names(), 0);
    EXPECT_EQ(entry.merge("later;lang-en", {"w"}), 0);
    EXPECT_EQ(entry.merge("later", {"w"}), 0);
    EXPECT_EQ(attr_delete(&entry, "later", nullptr), 0);
    EXPECT_EQ(entry.values("later;lang-en"), "w");
    EXPECT_EQ(entry.merge("later;lang-en", {"x"}), 0);
    EXPECT_EQ(entry.values("later;lang-en"), "w|x");
}

}  // namespace
