// The check of an entry: what each fault gives and tells, in every mode, and the tests by sets against a slow check
// over sets of names.
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"

#include <random>
#include <set>

#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"

using entry_test::text_entry;
using kind = ldcf_entry_finding_kind;

namespace {

#define PERSON "dn: cn=x|objectClass: top|objectClass: person|cn: x|sn: y"
#define TOP "dn: cn=x|objectClass: top|"

std::string finding(kind what, const std::string& name = "", std::int64_t count = 0)
{
    return (what < kind::top_added ? "fault " : "note ") + std::to_string(static_cast<int>(what)) + " " + name + " " +
           std::to_string(count);
}

bool is_no_fault(const std::string& found)
{
    return found[0] == 'n';
}

// Keeps findings as texts, and looks whether those of one kind come in the order of the handles.
class collector final : public ldcf_entry_sink {
public:
    void report(const ldcf_entry_finding& found) override
    {
        findings.insert(finding(found.kind, found.name == nullptr ? "" : found.name, found.count));
        const void* type = ldcf_find(ldcf_schema_g->attribute_types, found.name).get();
        const void* handle = type != nullptr ? type : ldcf_find(ldcf_schema_g->object_classes, found.name).get();
        in_order = in_order && (found.kind != kind_ || std::less<>()(handle_, handle));
        kind_ = found.kind;
        handle_ = handle;
    }
    std::multiset<std::string> findings;
    bool in_order = true;

private:
    kind kind_ = kind::no_objectclass;
    const void* handle_ = nullptr;
};

}  // namespace

TEST(LdcfEntryCheck, EachFaultHasItsResultAndItsWords)
{
    const entry_test::active_schema schema;
    struct {
        int mode;
        bool policy;
        const char* entry;
        int result;
        const char* log;
        const char* classes = nullptr;  // afterwards, where the check adds to them
    } const cases[] = {
        {2, false, PERSON, 0, ""},
        {2, true, PERSON "|pwdReset: TRUE|locked: a|system: a", 0, ""},
        {2, true, PERSON "|secret: a|locked;lang-en: a", 65, "9(secret,cn=x)"},
        {4, true, "dn: cn=x|none: a", 0, ""},
        {2, false, "dn: cn=x|cn: x", 65, "7(cn=x)"},
        {2, false, "cn: x", 65, "7()"},
        {2, false, "dn: cn=x|objectClass|cn: x", 65,
         "E Structural objectclass is missing|E number of base structural objectclass values is 0, must be 1."
         "|9(cn,cn=x)"},
        // One attribute: its name, its values.
        {2, false, PERSON "|cert;BINARY: a|oid.9.5: a", 0, ""},
        {2, false, PERSON "|note;binary: a", 65, ""},
        {2, false, PERSON "|;binary: a", 65, "E undefined attribute ;binary in entry cn=x|13(;binary,cn=x)"},
        {2, false, PERSON "|under\x7fscore: a", 65,
         "E undefined attribute under\x7fscore in entry cn=x|13(under\x7fscore,cn=x)"},
        {2, false, PERSON "|commonName;lang-en: a|note;lang-de: a", 0, ""},
        {2, false, "dn: cn=x|objectClass: none|serial: 1|serial: 2|none: a", 65,
         "E serial is single-valued attribute but has 2 values in entry cn=x"},
        {2, false, PERSON "|secret|serial: 1|serial;lang-en: 2", 0, ""},
        // One class.
        {2, false, TOP "objectClass: none|objectClass: more|cn: a|secret: a", 65,
         "E objectclass none is undefined for entry dn: cn=x|26(none)"},
        {9, false, TOP "objectClass: 8.4|secret: 1", 65,
         "E Structural objectclass is missing|E Invalid ldcf_api_schema_check_g value|9(secret,cn=x)"},
        // Aliases and referrals.
        {2, false, TOP "objectClass: ALIASobject|secret: a|aliasedentryname: cn=a", 0,
         "E Structural objectclass is missing"},
        {2, false, TOP "objectClass: Alias|objectClass: referral", 65,
         "Attribute aliasedObjectName/aliasedEntryName is missing"},
        {3, false, TOP "objectClass: alias|aliasedEntryName: cn=b|aliasedObjectName: cn=a", 65,
         "Cannot have both aliasedObjectName and aliasedEntryName attribute"},
        {2, false, TOP "objectClass: alias|aliasedObjectName: cn=a|aliasedObjectName: cn=b", 65,
         "Too many aliasedObjectName. Only one is allowed"},
        {2, false, "dn: cn=x|objectClass: REFERRAL|cn: x|Ref: a", 0, ""},
        {2, false, "dn: cn=x|objectClass: referral|cn: x|ref;lang-en: a", 65, "Attribute ref is missing"},
        // The tests by sets.
        {2, false, "dn: cn=x|objectClass: device|cn: x", 0,
         "ldcf_api_schema_check: top is missing from entry cn=x, will add", "device|top"},
        {2, false, "dn: cn=x|objectClass: EMPLOYEE|objectClass: 2.5.6.0|cn: x|sn: y|note: z", 65,
         "E super class person is missing from entry cn=x"},
        {3, false, "dn: cn=x|objectClass: device|cn: x|note: a|sn", 65,
         "ldcf_api_schema_check: super class top is missing from entry cn=x and will be added|9(note,cn=x)",
         "device|top"},
        {2, false, TOP "objectClass: person|objectClass: device|objectClass: employee|cn: x|sn: y|secret: a", 65,
         "E number of base structural objectclass values is 2, must be 1.|8(note,cn=x)|9(secret,cn=x)"},
        {1, false, TOP "objectClass: worker|note: a|owner: a", 65, "9(owner,cn=x)"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.mode) + " " + c.entry);
        ldcf_api_set_schema_check(c.mode);
        text_entry entry(c.entry);
        const std::string classes = c.classes == nullptr ? entry.values("objectClass") : c.classes;
        const test_support::debug_catcher debug(LDAP_DEBUG_ERROR | LDAP_DEBUG_TRACE);
        const test_support::message_catcher messages;
        bool added = true;
        EXPECT_EQ(ldcf_api_schema_check(&entry, &added, c.policy), c.result);
        EXPECT_EQ(added, c.classes != nullptr);
        EXPECT_EQ(entry_test::told(debug, messages), c.log);
        EXPECT_EQ(entry.values("objectClass"), classes);
    }
    EXPECT_EQ(ldcf_api_schema_check(nullptr, nullptr, true), 0);
}

TEST(LdcfEntryCheck, DnsAreNormalisedUnlessTheNormalFormIsThere)
{
    const entry_test::active_schema schema;
    const test_support::message_catcher messages;
    char norm_dn[] = "CN=X";
    for (const auto& [dn, result] : {std::pair("cn=x", 0), std::pair("cn", 34), std::pair("none=x", 17)}) {
        text_entry entry(std::string(PERSON "|dn: ") + dn);
        EXPECT_EQ(ldcf_api_schema_check(&entry, nullptr, false), result) << dn;
        EXPECT_EQ(entry.e_norm_dn, nullptr);
        entry.e_norm_dn = norm_dn;
        EXPECT_EQ(ldcf_api_schema_check(&entry, nullptr, false), 0) << dn;
    }
    text_entry with_byte_0(PERSON "|owner: cn=a" + std::string("\0b", 2));
    EXPECT_EQ(ldcf_api_schema_check(&with_byte_0, nullptr, false), 34);
    text_entry owned(PERSON "|owner: cn=a|owner: a");
    EXPECT_EQ(check_dn_in_attr(ldcf_schema_g, owned.find("owner")), 34);
    EXPECT_EQ(check_dn_in_attr(ldcf_schema_g, owned.find("cn")), 0);
    collector sink;
    EXPECT_EQ(ldcf_check_entry(*ldcf_schema_g, &owned, 2, false, nullptr, sink), 34);
    EXPECT_EQ(sink.findings, std::multiset{finding(kind::value_dn_invalid, "owner", 1)});
}

TEST(LdcfEntryCheck, WhatEndsACheckAtOnce)
{
    const entry_test::active_schema schema("");  // without the attributes of the policy
    text_entry entry("dn: cn=x|none: a|more: a");
    const test_support::debug_catcher debug;
    const test_support::message_catcher messages;
    EXPECT_EQ(ldcf_api_schema_check(&entry, nullptr, true), 65);
    EXPECT_EQ(check_aliasObject(&entry), 65);
    EXPECT_EQ(check_referralObject(&entry), 65);
    ldcf_api_set_schema_check(ldcf_check_declared);
    EXPECT_EQ(ldcf_api_schema_check(&entry, nullptr, true), 65);
    EXPECT_EQ(entry_test::told(debug, messages),
              "E undefined pwdpolicy attribute pwdChangedTime|Attribute none does not exist in the schema"
              "|Attribute none does not exist in the schema|13(pwdChangedTime,cn=x)|7(cn=x)");
}

namespace {

// ---- the slow check: sets of names, from what the classes declare ---------------------------------------------------

using names = std::set<std::string>;

template <typename T>
names primary(const ldcf_map_name_to<T>& map, const ldcf_names& written)
{
    names result;
    for (const csgl_string& name : written) {
        result.insert(ldcf_find(map, name).name().c_str());
    }
    return result;
}

names lineage_of(const names& classes)
{
    names all = classes;
    for (const std::string& name : classes) {
        const auto& map = ldcf_schema_g->object_classes;
        all.merge(lineage_of(primary(map, ldcf_find(map, name.c_str())->sup())));
    }
    return all;
}

std::multiset<std::string> slow_check(int mode, const names& present, const names& classes)
{
    const auto& map = ldcf_schema_g->object_classes;
    std::multiset<std::string> found;
    if (mode == 7) {
        found.insert(finding(kind::mode_invalid));
    }
    const auto is_structural = [&](const std::string& name) {
        return ldcf_find(map, name.c_str())->kind() == ldcf_objclass_kind::structural;
    };
    names superclasses;
    for (const std::string& name : classes) {
        superclasses.merge(lineage_of(primary(map, ldcf_find(map, name.c_str())->sup())));
    }
    if (std::none_of(classes.begin(), classes.end(), is_structural)) {
        found.insert(finding(kind::structural_class_missing));
    }
    const auto base = std::count_if(classes.begin(), classes.end(), [&](const std::string& name) {
        return is_structural(name) && superclasses.count(name) == 0;
    });
    if (mode == 2 && base != 1) {
        found.insert(finding(kind::structural_class_count, "", base));
    }
    for (const std::string& name : superclasses) {
        if (mode != 7 && classes.count(name) == 0) {
            found.insert(finding(mode == 3       ? kind::superclass_added
                                 : name == "top" ? kind::top_added
                                                 : kind::superclass_missing,
                                 name));
        }
    }
    names must;
    names may;
    for (const std::string& name : lineage_of(classes)) {
        must.merge(primary(ldcf_schema_g->attribute_types, ldcf_find(map, name.c_str())->must()));
        may.merge(primary(ldcf_schema_g->attribute_types, ldcf_find(map, name.c_str())->may()));
    }
    for (const std::string& name : must) {
        if (present.count(name) == 0) {
            found.insert(finding(kind::attribute_missing, name));
        }
    }
    for (const std::string& name : present) {
        if (must.count(name) + may.count(name) + classes.count("extensibleObject") == 0) {
            found.insert(finding(kind::attribute_not_allowed, name));
        }
    }
    return found;
}

}  // namespace

TEST(LdcfEntryCheck, RandomEntriesAreJudgedAsByTheSlowCheck)
{
    const entry_test::active_schema schema;
    std::mt19937 random(7);
    std::size_t accepted = 0;
    for (int round = 0; round < 3000; ++round) {
        const int mode = std::array{2, 3, 7}[random() % 3];
        names classes;
        for (const char* name : {"top", "person", "worker", "chief", "mark", "device", "sealed", "extensibleObject"}) {
            if (random() % 4 == 0) {
                classes.merge(random() % 2 == 0 ? names{name} : lineage_of({name}));
            }
        }
        names present;
        std::string text = "dn: cn=x|objectClass";
        for (const std::string& name : classes) {
            text += "|objectClass: " + name;
            present.insert("objectClass");
        }
        for (const char* name : {"cn", "sn", "note", "serial", "cert", "secret", "userPassword"}) {
            if (const auto value = random() % 6; value > 1) {  // 1: an attribute without values
                text += std::string("|") + name + ": 1" + (value == 5 ? std::string("|") + name + ";lang-en: 2" : "");
                present.insert(name);
            } else if (value == 1) {
                text += std::string("|") + name;
            }
        }
        SCOPED_TRACE(std::to_string(mode) + " " + text);
        text_entry entry(text);
        const std::multiset<std::string> expected = slow_check(mode, present, classes);
        const bool passes = std::all_of(expected.begin(), expected.end(), is_no_fault);
        collector sink;
        bool added = false;
        ASSERT_EQ(ldcf_check_entry(*ldcf_schema_g, &entry, mode, false, &added, sink), passes ? 0 : 65);
        ASSERT_EQ(sink.findings, expected);
        ASSERT_TRUE(sink.in_order);
        ASSERT_EQ(added, std::any_of(expected.begin(), expected.end(), is_no_fault) && mode != 7);
        accepted += passes ? 1 : 0;
    }
    EXPECT_GT(accepted, 100u);
}
