// The door to the schema: life cycle, look-ups under every spelling, predicates with their lists, and differences.
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

#include <memory>
#include <set>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using test_support::debug_catcher;

namespace {

// An active schema from texts, or from the shipped files, for as long as one lives.
class active_schema {
public:
    active_schema()
    {
        EXPECT_EQ(ldcf_api_schema_init(), 0);
        for (const std::string& file : schema_test::shipped_files()) {
            EXPECT_EQ(ldcf_api_schema_parse(file.c_str()), 0);
        }
        EXPECT_EQ(ldcf_api_schema_complete(), 0);
        EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
    }
    explicit active_schema(const char* text, const char* configuration = "")
    {
        ldcf_api_schema_init();
        ldcf_schema_g->parse_str(schema_test::required_text().c_str(), "required");
        ldcf_schema_g->parse_str(text, "home");
        ldcf_schema_g->parse_str(configuration, "V3.config.at");
        ldcf_schema_g->complete_nocheck();
        EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
    }
    ~active_schema() { ldcf_schema_g->clear(); }

private:
    schema_test::relational_store store_;
};

std::string joined(char** names)
{
    const std::unique_ptr<char*, void (*)(char**)> owned(names, charray_free);
    std::string text = names == nullptr ? "(null)" : "";
    for (; names != nullptr && *names != nullptr; ++names) {
        text += (text.empty() ? "" : " ") + std::string(*names);
    }
    return text;
}

// One of each kind that a predicate or a list asks about; "plain" is none of them.
constexpr char property_text[] = "attributeTypes { ( 2.5.4.0 NAME 'objectClass' SYNTAX " ARC
                                 "38 ) ( 2.5.4.3 NAME ( 'cn' 'alias' ) SYNTAX " ARC "15 )\n"
                                 "( 2.5.4.31 NAME 'member' SYNTAX " ARC "12 ) ( 7.1 NAME 'plain' SYNTAX " ARC "15 )\n"
                                 "( 7.2 NAME 'bin' SYNTAX " ARC "5 ) ( 7.3 NAME 'photo' SYNTAX " ARC "28 )\n"
                                 "( 7.4 NAME 'operation' SYNTAX " ARC "15 USAGE directoryOperation )\n"
                                 "( 7.5 NAME 'hashed' SYNTAX " ARC "15 ) ( 7.6 NAME 'secured' SYNTAX " ARC "15 ) }\n"
                                 "XANattributeTypes { ( 7.5 ENCRYPT SSHA ) ( 7.6 SECURE-CONNECTION-REQUIRED ) }\n";
constexpr char property_configuration[] = "attributeTypes:( 7.7 NAME 'setting' SYNTAX " ARC "15 )";

}  // namespace

TEST(LdcfApi, TheLifeCycleLoadsTheShippedSchemaAndEveryTypeHasItsRecord)
{
    const active_schema schema;
    std::set<const asyntaxinfo*> seen;
    EXPECT_EQ(ldcf_api_attrtype_apply(
                  [](asyntaxinfo* info, void* set) {
                      static_cast<std::set<const asyntaxinfo*>*>(set)->insert(info);
                      return info->attr != nullptr && info->table != nullptr && info->syntax != 0 ? 0 : 1;
                  },
                  &seen),
              0);
    EXPECT_EQ(ldcf_api_attrtype_apply([](asyntaxinfo*, void*) { return 7; }, nullptr), 80);
    std::size_t keys = 0;
    for (const auto& [key, type] : ldcf_schema_g->attribute_types) {
        const ldcf_hash_tbl_entry* node = ldcf_hash_get(key);
        ASSERT_TRUE(node != nullptr && node->info == type.info()) << key;
        EXPECT_EQ(seen.count(node->info), 1u);
        ++keys;
    }
    EXPECT_GT(keys, seen.size());
    EXPECT_EQ(ldcf_api_schema_entry_g, nullptr);
    for (const auto& [key, objclass] : ldcf_schema_g->object_classes) {
        EXPECT_EQ(ldcf_api_objectclass_get_info(key), objclass.info());
    }
    EXPECT_EQ(ldcf_api_objectclass_get_info("none"), nullptr);
    EXPECT_EQ(ldcf_api_objectclass_get_info(nullptr), nullptr);
}

TEST(LdcfApi, AFailedStepTellsOneAndTheDebugLog)
{
    const debug_catcher debug;
    const test_support::message_catcher log;
    const auto failed = [&](int (*step)(), const char* told) { return step() == 1 && debug.has(told); };
    EXPECT_TRUE(failed([] { return ldcf_api_schema_parse("no-such-file"); },
                       "ldcf_api_schema_parse(): unknown exception thrown!\n"));
    EXPECT_TRUE(failed(ldcf_api_schema_complete, "ldcf_api_schema_complete(): exception thrown!\n"));
    ldcf_schema_g->parse_str("attributeTypes:( 1 SYNTAX 5 )", "t");
    EXPECT_TRUE(failed(ldcf_api_schema_complete_db_names,
                       "ldcf_api_schema_complete_db_names(): exception thrown!\n"));  // no back end
    ldcf_schema_g->clear();
}

TEST(LdcfApi, NamesAreFoundUnderEverySpelling)
{
    const active_schema schema("attributeTypes { ( 2.5.4.3 NAME ( 'cn' 'commonName' ) SYNTAX " ARC
                               "15 ) ( 7.2 NAME 'cert' SYNTAX " ARC "8 )\n"
                               "( 7.3 NAME 'cert;binary' SYNTAX " ARC "15 )\n"
                               "( 7.5 NAME 'x;tag' SYNTAX " ARC "15 ) ( 7.6 NAME 'oid' SYNTAX " ARC "15 ) }");
    const std::string tag(240, 't');
    struct {
        std::string name;
        const char* oid;   // of the record, null for none
        const char* base;  // what base_out receives, "(untouched)", or null
        const char* oid_of_get_oid;
    } const cases[] = {
        {"", nullptr, "(untouched)", nullptr},
        {"cn", "2.5.4.3", "(untouched)", "2.5.4.3"},
        {"COMMONNAME", "2.5.4.3", "(untouched)", "2.5.4.3"},
        {"oId.CN", "2.5.4.3", "(untouched)", "2.5.4.3"},
        {"OID.2.5.4.3", "2.5.4.3", "(untouched)", "2.5.4.3"},
        {"oid.oid.cn", nullptr, nullptr, nullptr},
        {"oid.", nullptr, nullptr, nullptr},
        {"oid", "7.6", "(untouched)", "7.6"},
        {"none", nullptr, nullptr, nullptr},
        {"cn;lang-en", "2.5.4.3", "cn", nullptr},
        {"oid.commonName;a;b", nullptr, "commonName;a", nullptr},  // the last one is the tag
        {"none;lang-en", nullptr, "none", nullptr},
        {";", nullptr, "", nullptr},
        {"x;TAG", "7.5", "(untouched)", "7.5"},
        {"cn;" + tag, "2.5.4.3", "cn", nullptr},
        {"cn;" + tag + "t", nullptr, nullptr, nullptr},
        {"cert;Binary", "7.2", "(untouched)", "7.2"},  // whoever is called that
        {"7.2;binary", "7.2", "(untouched)", "7.2"},
        {"cn;binary", nullptr, "(untouched)", "2.5.4.3"},
        {"cn;lang-en;binary", nullptr, "(untouched)", nullptr},
        {"none;binary", nullptr, "(untouched)", nullptr},
        {";binary", nullptr, nullptr, nullptr},
        {"cert;lang-en", "7.2", "cert", nullptr},
        {std::string(1025, 'n'), nullptr, nullptr, nullptr},
        {"\xff\x80", nullptr, nullptr, nullptr},
    };
    for (const bool cached : {true, false}) {
        if (!cached) {
            ldcf_hash_flush();
        }
        for (const auto& c : cases) {
            if (!cached && c.name == "x;TAG") {
                continue;  // taken for a tag when the cache doesn't know better
            }
            char untouched[] = "(untouched)";
            char* base = untouched;
            const asyntaxinfo* info = ldcf_api_attr_get_info(c.name.c_str(), &base);
            EXPECT_EQ(info, ldcf_api_attr_get_info(c.name.c_str(), nullptr));
            const asyntaxinfo* expected =
                c.oid == nullptr ? nullptr : ldcf_find(ldcf_schema_g->attribute_types, c.oid).info();
            EXPECT_EQ(info, expected) << c.name;
            const bool missed = !cached && expected != nullptr && !c.name.ends_with("inary");
            const bool none = c.base == nullptr || (missed && c.base == std::string("(untouched)"));
            EXPECT_EQ(base == nullptr ? "(null)" : std::string(base), none ? "(null)" : c.base) << c.name;
            if (base != untouched) {
                std::free(base);
            }
            EXPECT_STREQ(ldcf_api_attr_get_oid(c.name.c_str()), c.oid_of_get_oid) << c.name;
        }
    }
    const debug_catcher debug;
    EXPECT_EQ(ldcf_api_attr_get_info(nullptr, nullptr), nullptr);
    EXPECT_EQ(ldcf_api_attr_get_oid(nullptr), nullptr);
    EXPECT_TRUE(debug.has("ldcf_api_attr_get_oid(): name is NULL!\n"));
    EXPECT_EQ(ldcf_api_attr_get_info(("a;" + tag + "t").c_str(), nullptr), nullptr);
    EXPECT_TRUE(debug.has("ldcf_api_attr_get_info(): parse_language_tags() failed.\n"));
}

TEST(LdcfApi, RecordsAreFoundByTableAndMadeAnewAfterAReset)
{
    const active_schema schema;
    ldcf_schema_g->incomplete();  // a record asked for between the steps of the life cycle has no table yet
    ldcf_schema_g->complete();
    EXPECT_STREQ(ldcf_api_attr_get_info("userPassword", nullptr)->table, "");
    EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
    EXPECT_EQ(ldcf_api_attr_get_info_based_on_table("USERPASSWORD"), ldcf_api_attr_get_info("userPassword", nullptr));
    EXPECT_EQ(ldcf_api_attr_get_info_based_on_table("userpassword"), ldcf_api_attr_get_info("userPassword", nullptr));
    EXPECT_EQ(ldcf_api_attr_get_info_based_on_table("nowhere"), nullptr);
    asyntaxinfo* info = ldcf_api_attr_get_info("sn", nullptr);
    EXPECT_EQ(get_qualified_table_name(info), info->table);
    free_qualified_table_name(info->table);
    info->syntax = 12345;
    ldcf_api_attrtype_reset_info("none");
    EXPECT_EQ(ldcf_api_attr_get_info("sn", nullptr)->syntax, 12345u);
    ldcf_api_attrtype_reset_info("SURNAME");
    EXPECT_EQ(ldcf_hash_get("sn"), nullptr);
    EXPECT_EQ(ldcf_api_attr_get_info("sn", nullptr)->syntax, 1u);
}

TEST(LdcfApi, PredicatesAndListsAnswerByTheirProperties)
{
    const active_schema schema(property_text, property_configuration);
    struct {
        const char* members;
        char** (*list)();
        bool (*predicate)(const char*);
        char** (*others)();  // the names that `members` leaves out
    } const cases[] = {
        {"cn plain bin photo hashed secured objectClass member", ldcf_api_get_attrcache_attrs, nullptr,
         ldcf_api_get_nonattrcache_attrs},
        {"cn plain bin photo hashed secured", ldcf_api_get_langtag_attrs, ldcf_api_is_langtag_attr,
         ldcf_api_get_nonlangtag_attrs},
        {"plain member hashed secured", ldcf_api_get_unique_attrs, ldcf_api_is_unique_attr, nullptr},
        {"operation setting cn objectClass bin", ldcf_api_get_nonunique_attrs, nullptr, nullptr},
        {"operation setting", ldcf_api_get_nonattrcache_attrs, ldcf_api_is_attrcache_attr, nullptr},
        {"setting", ldcf_api_get_config_attrs, ldcf_api_is_config_attr, ldcf_api_get_nonconfig_attrs},
        {"operation", ldcf_api_get_operational_attrs, ldcf_api_is_operational_attr, ldcf_api_get_nonoperational_attrs},
        {"hashed secured", ldcf_api_get_encrypted_attrs, nullptr, ldcf_api_get_nonencrypted_attrs},
    };
    const std::string all = "cn plain bin photo hashed secured objectClass member operation setting";
    const auto words = [](const std::string& text) {
        std::istringstream in(text);
        return std::set<std::string, decltype([](const std::string& a, const std::string& b) {
                            return csgl_str_ci_compare(a.c_str(), b.c_str()) < 0;
                        })>(std::istream_iterator<std::string>(in), {});
    };
    const auto sorted = [&](const std::string& text) {
        std::string result;
        for (const std::string& word : words(text)) {
            result += (result.empty() ? "" : " ") + word;
        }
        return result;
    };
    for (const auto& c : cases) {
        // A list stands in the order of the keys, of which "alias" and the oids are some; so it is sorted again.
        EXPECT_EQ(sorted(joined(c.list())), sorted(c.members));
        for (const std::string& name : words(all)) {
            EXPECT_TRUE(c.predicate == nullptr || c.predicate(name.c_str()) == (words(c.members).count(name) == 1))
                << name << " in " << c.members;
        }
        if (c.others != nullptr) {
            EXPECT_EQ(sorted(joined(c.others()) + " " + c.members), sorted(all));
        }
    }
    EXPECT_EQ(joined(ldcf_api_get_config_attrs()), "setting");
    EXPECT_EQ(joined(ldcf_api_get_nonencrypted_attrs()), "objectClass cn member plain bin photo operation setting");
    EXPECT_TRUE(ldcf_api_is_encrypted_attr("HASHED") && !ldcf_api_is_encrypted_attr("secured"));
    EXPECT_TRUE(ldcf_api_is_unique_attr("7.1") && !ldcf_api_is_unique_attr("none") &&
                !ldcf_api_is_unique_attr(nullptr));
    EXPECT_EQ(ldcf_api_schema_contains_encrypted_attributes(), 1);
    EXPECT_EQ(joined(ldcf_api_get_encryptable_attrs()) == joined(ldcf_api_get_nonencryptable_attrs()), false);
    for (const char* syntax : {"5", "8", "9", "10", "23", "28", "40"}) {
        EXPECT_TRUE(ldcf_api_is_binary_syntax((ARC + std::string(syntax)).c_str())) << syntax;
    }
    EXPECT_FALSE(ldcf_api_is_binary_syntax(ARC "4") || ldcf_api_is_binary_syntax("bin"));
}

TEST(LdcfApi, ListsWithoutMembersAreNullOrEmpty)
{
    const active_schema schema("");
    EXPECT_EQ(joined(ldcf_api_get_langtag_attrs()), "(null)");
    EXPECT_EQ(joined(ldcf_api_get_config_attrs()), "(null)");
    EXPECT_EQ(joined(ldcf_api_get_nonoperational_attrs()), "(null)");
    EXPECT_EQ(joined(ldcf_api_get_encryptable_attrs()), "");
    EXPECT_EQ(joined(ldcf_api_get_nonencrypted_attrs()), "");
    EXPECT_EQ(ldcf_api_schema_contains_encrypted_attributes(), 0);
}

TEST(LdcfApi, DifferencesOfAClassBetweenTheActiveAndTheProposedSchema)
{
    constexpr char types[] = "attributeTypes { ( 7.1 NAME ( 'a' 'aa' ) SYNTAX " ARC "15 ) ( 7.2 NAME 'b' SYNTAX " ARC
                             "15 ) ( 7.3 NAME 'c' SYNTAX " ARC "15 ) ( 7.10 NAME 'd' SYNTAX " ARC "15 ) }\n";
    struct {
        const char* active;
        const char* proposed;
        const char* expected;  // kind, superiors, then "oid:state" against the order of oids, and the count
    } const cases[] = {
        {"MUST a MAY b", "MUST AA MAY 7.2", "0 0 0"},
        {"MUST a MAY b", "MAY a MUST b", "0 0 7.2:7 7.1:6 2"},
        {"MUST a MAY b", "MUST c MAY d", "0 0 7.3:2 7.2:5 7.10:4 7.1:3 4"},
        {"MUST a MAY a", "MUST a", "0 0 7.1:7 1"},
        {"SUP parent MUST a", "SUP top STRUCTURAL MUST a", "0 1 0"},
        {"SUP ( parent $ top )", "SUP parent AUXILIARY", "1 0 0"},
    };
    for (const auto& c : cases) {
        const auto text = [&](const char* objclass) {
            return std::string(types) +
                   "objectClasses { ( 8.1 NAME 'top' ABSTRACT ) ( 8.2 NAME 'parent' SUP top MUST d )" +
                   "( 8.3 NAME 'x' " + objclass + " ) ( 8." + (objclass == c.active ? "4" : "5") + " NAME 'lonely' ) }";
        };
        const active_schema schema(text(c.active).c_str());
        ldcf_schema proposed;
        proposed.parse_str(schema_test::required_text().c_str(), "required");
        proposed.parse_str(text(c.proposed).c_str(), "home");
        proposed.complete_nocheck();
        const ldcf_objclass& x = ldcf_api_get_objclass_from_schema_g("X");

        EXPECT_EQ(ldcf_api_get_diff_info(x), nullptr);  // no change in progress
        ldcf_schema_proposed_g = &proposed;
        EXPECT_EQ(ldcf_api_attr_get_info_from_proposed_schema("aa"), ldcf_find(proposed.attribute_types, "7.1").info());
        std::string result = std::to_string(ldcf_api_compare_type(x)) + " " + std::to_string(ldcf_api_compare_SUP(x));
        const std::unique_ptr<ldcf_diff_info, heap_free> info(ldcf_api_get_diff_info(x));
        for (const ldcf_diff_node* node = info->list; node != nullptr; node = node->next) {
            result += " " + std::string(node->oid) + ":" + std::to_string(node->state);
        }
        EXPECT_EQ(result + " " + std::to_string(info->count), c.expected) << c.active << " | " << c.proposed;
        ldcf_api_list_diff_info_delete(info->list);
        const ldcf_objclass& lonely = ldcf_api_get_objclass_from_proposed_schema_g("lonely");
        EXPECT_EQ(ldcf_api_compare_type(lonely) + ldcf_api_compare_SUP(lonely), -2);
        EXPECT_EQ(ldcf_api_get_diff_info(lonely), nullptr);
        ldcf_schema_proposed_g = nullptr;
    }
    EXPECT_EQ(ldcf_api_list_diff_info_insert(nullptr, nullptr), -1);
}
