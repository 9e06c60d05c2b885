// The older check of an entry, and its parts on their own.
#include "servers/vrnd/libdirbase/schema/ldcf_oc_check.h"

#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"

using entry_test::text_entry;
using model_test::value_list;

namespace {

class LdcfOcCheck : public testing::Test {
    entry_test::active_schema schema_;
};

}  // namespace

TEST_F(LdcfOcCheck, EachFaultHasItsResultAndItsMessages)
{
    struct {
        const char* entry;
        int result;
        const char* messages;
    } const cases[] = {
        {"dn: cn=x|cn: x", 65, "7(cn=x)"},
        {"dn: cn=x|objectClass: person|cn: x|sn: y|serial: 1|serial: 2|flag: TRUE", 0, ""},
        {"dn: cn=x|objectClass: worker|note: z", 0, ""},  // neither the superclass nor what it requires
        {"dn: cn=x|objectClass: worker|note: z|sn: y|cn: x", 65, "9(sn,cn=x)|9(cn,cn=x)"},
        {"dn: cn=x|objectClass: device|objectClass: worker|secret: a", 65, "8(CommonName,cn=x)|8(note,cn=x)"},
        {"dn: cn=x|objectClass: device|objectClass: mark|2.5.4.3: x|SERIAL: 1|objectClass;lang-en: a", 65,
         "9(objectClass;lang-en,cn=x)"},
        {"dn: cn=x|objectClass: person|cn: x|sn: y|note;binary: a", 65, "9(note;binary,cn=x)"},
        {"dn: cn=x|objectClass: person|objectClass: Alias|secret: a|none: b", 65, "8(aliasedObjectName,cn=x)"},
        {"dn: cn=x|objectClass: none|objectClass: ALIASOBJECT|secret: a|none: b", 0, ""},
        {"dn: cn|objectClass: person|cn: x|sn: y|owner: cn", 34, ""},
        {"dn: none=x|objectClass: person|cn: x|sn: y|owner: none=x", 0, ""},  // the grammar is all that counts
        {"dn: cn=x|objectClass: person|cn: x|sn: y|flag: TRUE|flag: FALSE|owner: cn", 21, ""},
        {"dn: cn=x|objectClass: person|cn: x|sn: y|owner: cn=a|owner: cn|flag: TRUE|flag: FALSE", 34, ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.entry);
        const text_entry entry(c.entry);
        const test_support::debug_catcher debug(0);
        const test_support::message_catcher messages;
        EXPECT_EQ(ldcf_oc_schema_check(&entry), c.result);
        EXPECT_EQ(entry_test::told(debug, messages), c.messages);
    }
    const std::string junk("\0x", 2);  // behind a byte 0, which no name and no DN has
    const text_entry unknown("dn: cn=x|cn: x|sn: y|objectClass: person" + junk);
    EXPECT_EQ(ldcf_oc_schema_check(&unknown), 65);
    const text_entry no_dn("dn: cn=x|objectClass: person|cn: x|sn: y|owner: cn=a" + junk);
    EXPECT_EQ(ldcf_oc_schema_check(&no_dn), 34);
    EXPECT_EQ(ldcf_oc_schema_check(nullptr), 0);
}

TEST_F(LdcfOcCheck, ThePartsAnswerOnTheirOwn)
{
    const test_support::debug_catcher debug(0);
    const test_support::message_catcher messages;
    const text_entry entry("dn: cn=x|cn: x|sn");
    EXPECT_EQ(oc_check_required(&entry, "person"), 1);
    EXPECT_EQ(oc_check_required(&entry, "none"), 1);

    EXPECT_EQ(oc_check_allowed("secret", value_list({"device", "none", "person"}).get(), "cn=y"), 0);
    EXPECT_EQ(oc_check_allowed("secret", value_list({"device", "person"}).get(), "cn=y"), 1);
    EXPECT_EQ(oc_check_allowed("OBJECTCLASS", value_list({"device"}).get(), "cn=y"), 0);
    EXPECT_EQ(oc_check_allowed("note", nullptr, "cn=y"), 1);
    EXPECT_EQ(entry_test::told(debug, messages), "8(sn,cn=x)|9(secret,cn=y)|9(note,cn=y)");
}

TEST_F(LdcfOcCheck, NamesOfOneTypeCompareEqual)
{
    const std::pair<const char*, const char*> equal[] = {
        {"cn", "COMMONNAME"}, {"2.5.4.3", "cn"}, {"cert", "9.5;BINARY"}};
    for (const auto& [a, b] : equal) {
        EXPECT_EQ(oc_attr_type_cmp(a, b), 0) << a << " " << b;
    }
    const std::pair<const char*, const char*> unequal[] = {
        {"cn", "sn"},   {"cn", "cn;lang-en"}, {"cn", "oid.cn"},    {"none", "none"},
        {"cn", "none"}, {"cn", "cn;binary"},  {"cert", ";binary"}, {"cert;binary", "cert"},
    };
    for (const auto& [a, b] : unequal) {
        EXPECT_EQ(oc_attr_type_cmp(a, b), 1) << a << " " << b;
    }
}

TEST_F(LdcfOcCheck, OnlyThePasswordIsSoughtInTheListsThatAClassDeclares)
{
    std::string found;  // in MAY, in MUST, in both, and where there is no such place
    for (const char* objclass : {"person", "sealed", "worker", "none"}) {
        for (int where = 0; where < 4; ++where) {
            found += ldcf_api_oc_contains_attr(objclass, "cn", where) ? "+" : "-";
        }
    }
    EXPECT_EQ(found, "+-+-"
                     "-++-"
                     "----"
                     "----");
}
