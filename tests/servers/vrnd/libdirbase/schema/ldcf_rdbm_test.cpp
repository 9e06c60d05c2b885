// Names in the relational store.
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::refused;
using test_support::message_catcher;

namespace {

// The digits of the slot of a name in a table of 7001: a slow form of the hash of ELF symbol tables.
std::string slot_digits(const std::string& name)
{
    unsigned long long h = 0;
    for (const char c : name) {
        h = (h * 16 + static_cast<unsigned long long>(c)) % 0x100000000ull;
        h = (h ^ (h / 0x10000000ull * 16)) % 0x10000000ull;
    }
    std::string digits;
    for (h %= 7001; digits.size() < 7; h /= 32) {
        digits.insert(0, 1, "0123456789ABCDEFGHIJKLMNOPQRSTUV"[h % 32]);
    }
    return digits;
}

const char* owner(Backend*)
{
    return "OWNER";
}
const char* no_owner(Backend*)
{
    return "";
}
const char* entries(Backend*)
{
    return "owner.entries";
}

// A list of back ends for as long as one lives.
class back_ends {
public:
    explicit back_ends(Backend* head) { g_backends = head; }
    ~back_ends()
    {
        g_backends = nullptr;
        g_srvType = 2;
    }
};

std::string table(const std::string& name, int access_class = 0, int have_db_names = 0)
{
    return std::string(ldcf_rdbm::normalize_table_name(name.c_str(), access_class, have_db_names));
}

}  // namespace

TEST(LdcfRdbm, UnpackIntWritesTheLowest35BitsInBase32)
{
    const std::pair<std::uint64_t, const char*> cases[] = {{0, "0000000"},          {31, "000000V"},
                                                           {32, "0000010"},         {1ull << 34, "G000000"},
                                                           {1ull << 35, "0000000"}, {~0ull, "VVVVVVV"}};
    for (const auto& [value, digits] : cases) {
        char out[8] = "xxxxxxx";
        EXPECT_EQ(unpack_int(value, out), 0);
        EXPECT_STREQ(out, digits);
    }
    const test_support::debug_catcher debug;
    EXPECT_EQ(unpack_int(1, nullptr), 1);
    EXPECT_TRUE(debug.has("unpack_int: input result is null.\n"));
}

TEST(LdcfRdbm, ColumnNamesAreCutFoldedAndMadeAcceptable)
{
    const std::pair<std::string, std::string> cases[] = {
        {"", ""},
        {"cn", "CN"},
        {"a-b_c;1", "A_B_C;1"},
        {"iai", "IAX"},
        {"I", "X"},
        {"abcdefghijklmnopq", "ABCDEFGHIJKLMNOPQ"},
        {"abcdefghijklmnoijk", "ABCDEFGHIJKLMNOX"},
    };
    for (const auto& [name, column] : cases) {
        const message_catcher log;
        EXPECT_EQ(std::string(ldcf_rdbm::normalize_column_name(name.c_str())), column);
        EXPECT_EQ(log.count(), name.size() > 17 ? 1u : 0u);
        for (const test_support::caught_message& cut : log.messages()) {
            EXPECT_TRUE(cut.component == 7 && cut.severity == 4 && cut.id == 31);
            EXPECT_EQ(cut.arguments, (std::vector<std::string>{name, name.substr(0, 16)}));
        }
    }
}

TEST(LdcfRdbm, TableNamesAreCutFoldedAndQualified)
{
    Backend proxy{.be_type = "proxy", .be_table_qualifier = no_owner};
    Backend rdbm{.be_type = "RDBM", .be_next = &proxy, .be_table_qualifier = owner, .be_entry_table = entries};
    const back_ends list(&rdbm);
    EXPECT_EQ(table("a-bi", 5), "OWNER.A_BX");
    EXPECT_EQ(table("any", 4), "owner.entries");
    EXPECT_EQ(table("xanEntryUuid", 4) + table("CryptoSync", 4) + table("CryptoSalt", 4),
              "OWNER.XANENTRYUUIDOWNER.CRYPTOSYNCOWNER.CRYPTOSALT");
    EXPECT_EQ(table("cryptosalt", 4), "owner.entries");
    const std::string longest(128, 'z');
    EXPECT_EQ(table(longest), "OWNER." + std::string(128, 'Z'));
    const std::pair<int, std::string> cases[] = {
        {32, longest.substr(0, 121) + slot_digits(longest.substr(0, 121))}, {30, longest}, {30, longest}};
    for (int have_db_names = 0; have_db_names <= 2; ++have_db_names) {
        const auto& [id, cut] = cases[have_db_names];
        const message_catcher log;
        std::string upper = cut;
        std::replace(upper.begin(), upper.end(), 'z', 'Z');
        EXPECT_EQ(table(longest + "i", 0, have_db_names), "OWNER." + upper);
        ASSERT_EQ(log.count(7, id), 1u);
        EXPECT_EQ(log.messages().front().severity, 1);
        EXPECT_EQ(log.messages().front().arguments, (std::vector<std::string>{longest + "i", cut}));
    }
    g_srvType = 1;  // the proxy, whose qualifier is empty and which has no table of entries
    EXPECT_EQ(table("cn") + table("cn", 4), "CNLDAP_ENTRY");
    rdbm.be_next = nullptr;
    EXPECT_EQ(refused([] { table("cn"); }), "exc_assertion_failed_t 0: unexpected null pointer");
}

TEST(LdcfRdbm, ATypesNamesComeFromItsDefinitionOrItsPrimaryName)
{
    Backend rdbm{.be_type = "rdbm", .be_table_qualifier = owner};
    const back_ends list(&rdbm);
    const message_catcher log;
    const char* const cases[][3] = {
        {"", "OWNER.A_LONG_ATTRIBUTE_NAME|A_LONG_ATTRIBUTE",
         "( 1 DBNAME ( 'a_long_attribute_name' 'A_LONG_ATTRIBUTE' ) ACCESS-CLASS NORMAL LENGTH 240 )"},
        {"DBNAME 'tabli' EQUALITY 3", "OWNER.TABLX|TABLX",
         "( 1 DBNAME 'tabli' ACCESS-CLASS NORMAL LENGTH 240 EQUALITY 3 )"},
        {"DBNAME ( 't' 'c' ) ACCESS-CLASS SYSTEM LENGTH 7 NONMATCHABLE", "LDAP_ENTRY|C",
         "( 1 DBNAME ( 't' 'c' ) ACCESS-CLASS SYSTEM LENGTH 7 NONMATCHABLE )"},
        {"DBNAME 'a-b'", "exc_invalid_input_t 0: Hyphen is not allowed in table name 'a-b'. Replace it with '_'", ""},
        {"DBNAME ( 'a' 'b-' )", "exc_invalid_input_t 0: Hyphen is not allowed in column name 'b-'. Replace it with '_'",
         ""},
    };
    for (const auto& [extended, names, with_default] : cases) {
        ldcf_schema schema;
        schema.parse_str(("ldapSyntaxes:( 5 ) attributeTypes:( 1 NAME 'a-long-attribute-name' SYNTAX 5 )" +
                          (*extended == '\0' ? "" : "XANattributeTypes:( 1 " + std::string(extended) + " )"))
                             .c_str(),
                         "t");
        schema.complete_nocheck();
        const ldcf_attrtype type = schema.attribute_types["1"];
        g_backends = &rdbm;
        std::string result = schema_test::refused([&] { type->complete_db_names(); });
        if (result.empty()) {
            result = std::string(type->table()) + "|" + type->column().c_str();
            EXPECT_STREQ(type->xan_string_with_default(), with_default);
            g_backends = nullptr;  // done once: the store isn't asked again
            type->complete_db_names();
        }
        EXPECT_EQ(result, names);
    }
}
