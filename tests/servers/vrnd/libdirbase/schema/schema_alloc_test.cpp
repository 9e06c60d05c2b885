// The schema with every allocation failing in turn: one class of exception from the engine, a code or null from the
// interface; nothing lost, the active schema and its files unchanged.
#include <optional>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libcsgl/csgl_file.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"
#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"
#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"
#include "tests/support/alloc_table.h"
#include "tests/support/expect_clean.h"
#include "tests/support/temp_dir.h"

using namespace test_support;
using entry_test::text_entry;
using schema_test::content_of;
using schema_test::described;
using schema_test::parsed;

namespace {

// A schema with all of the grammar, and without the required definitions.
const std::string tiny_text =
    "ldapSyntaxes { ( " ARC "15 DESC 'Text' ) ( " ARC "38 ) } matchingRules { ( 2.5.13.0 SYNTAX " ARC "38 )\n"
    "( 2.5.13.2 NAME 'caseIgnoreMatch' DESC 'd' SYNTAX '" ARC "15' )\n"
    "( 2.5.13.4 NAME ( 'caseIgnoreSubstringsMatch' 'another' ) SYNTAX " ARC "15 ) }\n" +
    std::string(schema_test::small_text) +
    "attributeTypes:( 9.3 NAME 'alternate' SUP name ) attributeTypes:( 9.6 NAME 'quoted' SYNTAX '" ARC "15{8}' )";

TEST(SchemaAlloc, ParsingFailsCleanlyAtEveryPoint)
{
    EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                  ldcf_schema schema;
                  expect_clean([&] { schema.parse_str(tiny_text.c_str(), "test"); });
                  const alloc_fault_pause pause;
                  EXPECT_NE(described(schema), "");  // every key leads to a body, and what is there prints
              }),
              100u);
}

TEST(SchemaAlloc, AFailedCompletionCanBeUndoneAndTriedAgain)
{
    const schema_test::relational_store store;
    std::string expected;
    EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                  std::optional<alloc_fault_pause> pause(std::in_place);
                  ldcf_schema schema;
                  schema.parse_str(tiny_text.c_str(), "test");
                  const auto complete = [&] {
                      schema.complete_nocheck();
                      schema.complete_db_names();
                  };
                  pause.reset();
                  expect_clean(complete);
                  schema.incomplete();
                  pause.emplace();
                  complete();
                  expected = expected.empty() ? described(schema) : expected;
                  EXPECT_EQ(described(schema), expected);
              }),
              20u);
}

TEST(SchemaAlloc, ChangesOfACopyFailCleanlyAndLeaveTheOriginal)
{
    const schema_test::relational_store store;
    ldcf_schema original;
    schema_test::load_small(original);
    const std::string before = described(original);
    const auto insert = [](ldcf_schema& schema, auto definition) { schema.insert(definition); };
    const auto erase = [](ldcf_schema& schema, auto definition) { schema.erase(definition); };
    const auto replace = [](ldcf_schema& schema, auto definition) { schema.replace(definition); };
    const std::function<void(ldcf_schema&)> changes[] = {
        [&](ldcf_schema& s) { insert(s, parsed<ldcf_syntax>("( 5.5 )")); },
        [&](ldcf_schema& s) { insert(s, parsed<ldcf_matchrule>("( 7 NAME 'x' SYNTAX " ARC "15 )")); },
        [&](ldcf_schema& s) { insert(s, parsed<ldcf_attrtype>("( 7 NAME ( 'x' 'y' ) SUP cn )")); },
        [&](ldcf_schema& s) { insert(s, parsed<ldcf_objclass>("( 7 NAME 'x' SUP employee )")); },
        [&](ldcf_schema& s) { erase(s, parsed<ldcf_attrtype>("( 9.5 NAME 'spare' )")); },
        [&](ldcf_schema& s) { erase(s, parsed<ldcf_objclass>("( 8.3 NAME 'worker' )")); },
        [&](ldcf_schema& s) { replace(s, parsed<ldcf_attrtype>("( 9.5 NAME 'new' SUP cn )")); },
        [&](ldcf_schema& s) { replace(s, parsed<ldcf_objclass>("( 8.2 NAME ( 'human' 'person' ) MAY cn )")); },
    };
    for (const auto& change : changes) {
        EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                      std::optional<alloc_fault_pause> pause(std::in_place);
                      ldcf_schema copy;
                      copy.copy(original);
                      pause.reset();
                      expect_clean([&] { change(copy); });
                  }),
                  5u);
    }
    EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                  ldcf_schema copy;
                  expect_clean([&] { copy.copy(original); });
                  const alloc_fault_pause pause;
                  EXPECT_TRUE(allocation_failed() || described(copy) == before);
              }),
              300u);
    EXPECT_EQ(described(original), before);
}

// The active schema on two files.
class schema_on_files {
public:
    schema_on_files()
    {
        ldcf_schema_g->parse(dir.write("required", schema_test::required_text()).c_str());
        ldcf_schema_g->parse(dir.write("home", schema_test::small_text).c_str());
        ldcf_schema_g->complete();
        ldcf_schema_g->complete_db_names();
        before_ = now();
    }
    ~schema_on_files() { ldcf_schema_g->clear(); }

    std::string now() const { return described(*ldcf_schema_g) + content_of(dir.path()); }
    bool unchanged() const { return now() == before_; }

    const temp_dir dir;

private:
    const schema_test::relational_store store_;
    std::string before_;
};

// A vote, a commit or a cleanup that fails leaves the active schema and its files, and the change can be made
// afterwards.
template <typename T, typename Modify>
void expect_change_survives(const char* text, ldcf_modify_op op, const Modify& modify)
{
    const auto run = [&](T& definition, ldcf_modify_phase phase) { modify(nullptr, op, phase, definition); };
    for (const ldcf_modify_phase failing : {ldcf_modify_vote, ldcf_modify_commit, ldcf_modify_cleanup}) {
        SCOPED_TRACE(std::string(text) + ", phase " + std::to_string(failing));
        // Only a commit changes it.
        const bool commits = failing == ldcf_modify_commit;
        const auto kept = commits ? nullptr : std::make_unique<schema_on_files>();
        for_each_failing_allocation([&](std::size_t) {
            std::optional<alloc_fault_pause> pause(std::in_place);
            const auto fresh = commits ? std::make_unique<schema_on_files>() : nullptr;
            const schema_on_files& schema = commits ? *fresh : *kept;
            T definition = parsed<T>(text);
            if (failing != ldcf_modify_vote) {
                run(definition, ldcf_modify_vote);
            }
            pause.reset();
            const auto change = [&] { run(definition, failing); };
            expect_clean(std::ref(change));
            pause.emplace();
            if (failing == ldcf_modify_cleanup) {
                std::filesystem::remove(schema.dir.path("home.tmp"));
            } else {
                run(definition, ldcf_modify_cleanup);
            }
            if (commits && !allocation_failed()) {
                EXPECT_FALSE(schema.unchanged());
                return;
            }
            EXPECT_TRUE(schema.unchanged());
            EXPECT_EQ(described(*ldcf_schema_proposed_g), schema_test::nothing);
            if (commits) {
                T again = parsed<T>(text);
                run(again, ldcf_modify_vote);
                run(again, ldcf_modify_commit);
                run(again, ldcf_modify_cleanup);
                EXPECT_FALSE(schema.unchanged());
            }
        });
    }
}

TEST(SchemaAlloc, EachKindOfDefinitionIsChangedWhollyOrNotAtAll)
{
    expect_change_survives<ldcf_attrtype>("( 9.5 NAME 'spare' DESC 'new' SUP cn )", ldcf_modify_replace,
                                          ldcf_schema_modify_attrtype);
    expect_change_survives<ldcf_syntax>("( 5.5 DESC 'new' )", ldcf_modify_add, ldcf_schema_modify_syntax);
    expect_change_survives<ldcf_matchrule>("( 5.6 NAME 'newRule' SYNTAX " ARC "15 )", ldcf_modify_add,
                                           ldcf_schema_modify_matchrule);
    expect_change_survives<ldcf_objclass>("( 8.3 NAME 'worker' )", ldcf_modify_delete, ldcf_schema_modify_objclass);
}

// What raises: one class of exception for memory, nothing lost.
TEST(SchemaAlloc, TextsAndFilesOfTheFoundationRaiseOneException)
{
    const entry_test::active_schema schema;
    const quiet_logs quiet;
    const temp_dir folder;
    const std::string path = folder.write("file", "text");
    const std::string other = folder.path("other");
    const csgl_string name("a name that is too long to be kept inside of a body without a block");
    const ldcf_names names = {"a", "b"};
    const auto read = [](const char* text, auto reader) {
        return [=] {
            ldcf_token_factory factory(text, "test");
            reader(factory);
        };
    };
    const auto texts_of = [](auto definition) {
        return [=] {
            const auto copy = definition.clone();
            copy.v3_string();
            copy.v3_string_inherited();
        };
    };
    const std::pair<const char*, std::function<void()>> actions[] = {
        {"csgl_allocate", [] { csgl_free(csgl_allocate(9, __FILE__, __LINE__)); }},
        {"csgl_local_array_of", [] { csgl_local_array_of<int> array(3); }},
        {"ldcf_quoted_parameter", [&] { ldcf_quoted_parameter(name); }},
        {"ldcf_number", [] { ldcf_number(7); }},
        {"ldcf_temporary_of", [&] { ldcf_temporary_of(name); }},
        {"ldcf_backup_of", [&] { ldcf_backup_of(name); }},
        {"ldcf_stream::oids", [&] { ldcf_stream::oids("MUST", names); }},
        {"ldcf_stream::qdescrs", [&] { ldcf_stream::qdescrs("NAME", names, "b"); }},
        {"normalize_table_name", [&] { ldcf_rdbm::normalize_table_name(name, 0, 0); }},
        {"normalize_column_name", [&] { ldcf_rdbm::normalize_column_name(name); }},
        {"csgl_file::canonize", [] { csgl_file::canonize("x"); }},
        {"csgl_file::copy", [&] { csgl_file::copy(path.c_str(), other.c_str(), csgl_file_force); }},
        {"operator+", [&] { name + name; }},
        {"ldcf_schema::check", [] { ldcf_schema_g->check(); }},
        {"ldcf_syntax::clone, texts", texts_of(parsed<ldcf_syntax>("( 5.5 DESC 'd' )"))},
        {"ldcf_matchrule::clone, texts", texts_of(parsed<ldcf_matchrule>("( 5.6 NAME 'x' SYNTAX " ARC "15 )"))},
        {"ldcf_attrtype::clone, texts", texts_of(parsed<ldcf_attrtype>("( 7 NAME ( 'x' 'y' ) SUP cn )"))},
        {"ldcf_objclass::clone, texts", texts_of(parsed<ldcf_objclass>("( 7 NAME 'x' SUP employee )"))},
        {"csgl_message", [] { csgl_message("[p[a]p] b", 0, __FILE__, 1); }},
        {"ldcf_recovery",
         [&] {
             const csgl_vector<csgl_string> files = {path.c_str()};
             const ldcf_recovery recovery(files);
             recovery.concerned();
             recovery.source_of(files[0]);
         }},
        {"oid", read("1.2", ldcf_stream::oid)},
        {"oids", read("( a $ b )", [](ldcf_token_factory& factory) { ldcf_stream::oids(factory); })},
        {"qnoid", read("'1.2'", ldcf_stream::qnoid)},
        {"qdstring", read("'a b'", ldcf_stream::qdstring)},
        {"qdstrings", read("( 'a' 'b' )", ldcf_stream::qdstrings)},
        {"descr", read("abc", ldcf_stream::descr)},
        {"qdescr", read("'abc'", ldcf_stream::qdescr)},
        {"optlen", read("{3}", ldcf_stream::optlen)},
        {"qdescrs", read("( 'a' 'b' )",
                         [](ldcf_token_factory& factory) {
                             csgl_string primary;
                             ldcf_stream::qdescrs(factory, primary);
                         })},
    };
    for (const auto& [what, action] : actions) {
        SCOPED_TRACE(what);
        for_each_failing_allocation([&](std::size_t) { expect_clean(action); });
        EXPECT_EQ(folder.read("file"), "text");
    }
}

TEST(SchemaAlloc, ARecoveryWithoutMemoryCanBeTriedAgain)
{
    const temp_dir folder;
    const std::string file = folder.path("file");
    const char* const files[] = {file.c_str()};
    const quiet_logs quiet;
    for_each_failing_allocation([&](std::size_t) {
        calm([&] {
            folder.write("file", "new");
            folder.write("file.tmp", "left");
            folder.write("file.tmp.old", "old");
        });
        const int result = ldcf_recover_files(files, 1);
        const alloc_fault_pause pause;
        EXPECT_EQ(result, allocation_failed() ? 1 : 0);
        if (result != 0) {
            EXPECT_EQ(ldcf_recover_files(files, 1), 0);
        }
        EXPECT_EQ(content_of(folder.path()), "file:\nold");
    });
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that makes the records

class SchemaCallsAlloc : public testing::Test {
protected:
    const entry_test::active_schema schema_;
    const quiet_logs quiet_;  // behind the schema, whose making listens to the log itself
};

calm_text tell_names(char** names)
{
    int count = 0;
    for (char** name = names; name != nullptr && *name != nullptr; ++name) {
        ++count;
    }
    charray_free(names);
    return tell(names == nullptr ? -1 : count);
}

TEST_F(SchemaCallsAlloc, EveryListIsWholeOrNull)
{
    using list = char** (*)();
    const std::pair<const char*, list> lists[] = {
        {"langtag", ldcf_api_get_langtag_attrs},
        {"nonlangtag", ldcf_api_get_nonlangtag_attrs},
        {"unique", ldcf_api_get_unique_attrs},
        {"nonunique", ldcf_api_get_nonunique_attrs},
        {"attrcache", ldcf_api_get_attrcache_attrs},
        {"nonattrcache", ldcf_api_get_nonattrcache_attrs},
        {"nonconfig", ldcf_api_get_nonconfig_attrs},
        {"operational", ldcf_api_get_operational_attrs},
        {"nonoperational", ldcf_api_get_nonoperational_attrs},
        {"encryptable", ldcf_api_get_encryptable_attrs},
        {"nonencryptable", ldcf_api_get_nonencryptable_attrs},
        {"encrypted", ldcf_api_get_encrypted_attrs},
        {"nonencrypted", ldcf_api_get_nonencrypted_attrs},
    };
    for (const auto& [name, call] : lists) {
        const std::string whole = tell_names(call()).str();
        if (whole == "-1") {
            continue;  // a list without members allocates nothing
        }
        expect_outcomes({row(name, whole, {"-1"}, [call = call] { return tell_names(call()); })});
    }
}

void forget(const char* name)
{
    const alloc_fault_pause pause;
    ldcf_api_attrtype_reset_info(name);
}

TEST_F(SchemaCallsAlloc, RecordsAreMadeOrNullAndMadeBySomebodyElse)
{
    ldcf_schema proposed;
    proposed.copy(*ldcf_schema_g);
    ldcf_schema_proposed_g = &proposed;
    const auto& types = ldcf_schema_g->attribute_types;
    const ldcf_attrtype& note_type = ldcf_api_get_attrtype_from_schema_g("note");
    const ldcf_objclass& worker = ldcf_api_get_objclass_from_schema_g("worker");
    const temp_dir folder;
    const std::string dump = folder.path("dump");
    asyntaxinfo* const note = model_test::info_of("note");
    ldcf_hash_flush();
    ldcf_hash_put("note", note);
    ldcf_debug_hash_tbl(dump.c_str());
    const std::string whole_dump = folder.read("dump");
    EXPECT_TRUE(whole_dump.ends_with("Number of elements:\t\t1\n"));
    const auto record = [](auto look_up) {
        return [=] {
            forget("note");
            const calm_text told = tell(look_up() != nullptr);
            forget("note");
            return told;
        };
    };
    expect_outcomes({
        row("ldcf_attrtype_get_info", "1", {"0"}, record([&] { return ldcf_attrtype_get_info(types, "note"); })),
        row("ldcf_attrtype_get_info_based_on_table", "1", {"0"},
            record([&] { return ldcf_attrtype_get_info_based_on_table(types, "NOTE"); })),
        row("ldcf_api_attr_get_info_based_on_table", "1", {"0"},
            record([] { return ldcf_api_attr_get_info_based_on_table("note"); })),
        row("ldcf_api_attr_get_info_from_proposed_schema", "1", {"0"},
            [] {
                const bool made = ldcf_api_attr_get_info_from_proposed_schema("note") != nullptr;
                calm([] { ldcf_api_get_attrtype_from_proposed_schema_g("note").reset_info(); });
                return tell(made);
            }),
        row("ldcf_api_attrtype_apply", "0 all", {"80 some"},
            [] {
                forget("note");
                int seen = 0;
                const int result = ldcf_api_attrtype_apply(
                    [](asyntaxinfo*, void* argument) {
                        ++*static_cast<int*>(argument);
                        return 0;
                    },
                    &seen);
                forget("note");
                return tell(result, seen > 20 ? " all" : seen > 10 ? " some" : "");
            }),
        row("ldcf_rdbm::fill_asyntaxinfo",
            [&] { return tell_made(ldcf_rdbm::fill_asyntaxinfo(note_type), ldcf_rdbm::delete_asyntaxinfo); }),
        row("ldcf_rdbm::fill_classinfo",
            [&] { return tell_made(ldcf_rdbm::fill_classinfo(worker), ldcf_rdbm::delete_objectclassinfo); }),
        row("ldcf_api_attr_get_oid", "1", {"0"},
            [] {
                forget("cert");
                const calm_text told = tell(ldcf_api_attr_get_oid("cert;binary") != nullptr);
                forget("cert");
                return told;
            }),
        row("ldcf_api_attr_get_info, a version", "1 cn", {"0 (null)"},
            [] {
                char* base = nullptr;
                model_test::info_of("cn");
                const bool found = ldcf_api_attr_get_info("cn;lang-en", &base) != nullptr;
                return tell(found, " ") + tell_freed(base);
            }),
        // By the map, if need be.
        row("ldcf_api_load_attr_hash", "11", {"01", "11"},
            [] {
                ldcf_api_load_attr_hash();
                const bool cached = ldcf_hash_get("cn") != nullptr;
                const bool found = calm([] { return model_test::info_of("cn"); }) != nullptr;
                ldcf_hash_flush();
                return tell(cached, found);
            }),
        row("ldcf_debug_hash_tbl", "whole", {"absent", "whole"},
            [&] {
                calm([] { ldcf_hash_put("note", ldcf_api_attr_get_info("note", nullptr)); });
                ldcf_debug_hash_tbl(dump.c_str());
                ldcf_hash_flush();
                return calm([&] {
                    const bool written = std::filesystem::exists(dump);
                    const std::string text = written ? folder.read("dump") : "";
                    std::filesystem::remove(dump);
                    return calm_text(!written ? "absent" : text == whole_dump ? "whole" : "cut");
                });
            }),
        row("ldcf_hash_put", "1", {"0"},
            [] {
                asyntaxinfo info = {};
                ldcf_hash_flush();
                ldcf_hash_put("x", &info);
                const calm_text told = tell(ldcf_hash_get("X") != nullptr);
                ldcf_hash_flush();
                return told;
            }),
        row("ldcf_api_list_diff_info_new",
            [] {
                return tell_made(ldcf_api_list_diff_info_new("1.2", attr_diff_newly_may),
                                 ldcf_api_list_diff_info_delete);
            }),
    });
    // Records of classes stay with them, so each run needs a class of its own.
    for_each_failing_allocation([&](std::size_t) {
        ldcf_schema fresh;
        calm([&] { fresh.copy(*ldcf_schema_g); });
        const objectclassinfo* const info = ldcf_objectclass_get_info(fresh.object_classes, "person");
        EXPECT_EQ(info == nullptr, allocation_failed());
        calm([&] { fresh.clear(); });
    });
    ldcf_schema_proposed_g = nullptr;
}

TEST_F(SchemaCallsAlloc, TheLifeCycleStopsWithOne)
{
    const temp_dir folder;
    const std::string file = folder.write("home", entry_test::schema_text);
    const std::string required = folder.write("required", schema_test::required_text());
    const auto reload = [&](int steps) {
        ldcf_schema_g->clear();
        int result = steps > 0 ? ldcf_api_schema_parse(required.c_str()) : 0;
        result += steps > 0 ? ldcf_api_schema_parse(file.c_str()) : 0;
        result += steps > 1 ? ldcf_api_schema_complete() : 0;
        return result;
    };
    expect_outcomes({
        row("ldcf_api_schema_parse", "0", {"1"},
            [&] {
                calm([&] { reload(0); });
                const int result = ldcf_api_schema_parse(file.c_str());
                calm([&] {
                    EXPECT_EQ(ldcf_schema_g->files.empty(), result != 0);
                    reload(0);
                });
                return tell(result);
            }),
        row("ldcf_api_schema_complete", "0", {"1"},
            [&] {
                calm([&] { EXPECT_EQ(reload(1), 0); });
                const int result = ldcf_api_schema_complete();
                calm([&] { reload(0); });
                return tell(result);
            }),
        // Without memory the cache of names stays empty, which is no failure.
        row("ldcf_api_schema_complete_db_names", "0", {"1", "0"},
            [&] {
                calm([&] { EXPECT_EQ(reload(2), 0); });
                const int result = ldcf_api_schema_complete_db_names();
                calm([&] { reload(0); });
                return tell(result);
            }),
    });
}

TEST_F(SchemaCallsAlloc, ChecksOfAnEntryAndTheSchemaAsOne)
{
    ldcf_schema schema;
    schema.parse_str("attributeTypes:( 1.1 NAME 'a' SYNTAX 1.3 )\nldapSyntaxes:( 1.3 )\nobjectClasses:( 1.2 ABSTRACT )",
                     "home");
    schema.complete_nocheck();
    struct : ldcf_entry_sink {
        void report(const ldcf_entry_finding&) override {}
    } quiet;
    constexpr char whole[] = "dn: cn=x|objectClass: person|cn: x|sn: y|cert;binary: a|owner: cn=a";
    const auto with_entry = [](const char* text, auto check) {
        return [=] {
            auto entry = calm([&] { return std::make_unique<text_entry>(text); });
            try {
                return tell(check(*entry));
            } catch (const exc_not_enough_memory_t&) {
                return calm_text("raised");
            }
        };
    };
    expect_outcomes({
        row("ldcf_check_entry", "0", {"0", "90", "raised"},
            with_entry(whole,
                       [&](text_entry& entry) {
                           return ldcf_check_entry(*ldcf_schema_g, &entry, ldcf_check_strict, false, nullptr, quiet);
                       })),
        // A value that couldn't be added is no failure, nor is the DN of the entry without a record.
        row("ldcf_api_schema_check", "0", {"0", "1", "90"},
            with_entry(whole, [](text_entry& entry) { return ldcf_api_schema_check(&entry, nullptr, true); })),
        row("ldcf_oc_schema_check", "0", {"90"},
            with_entry(whole, [](text_entry& entry) { return ldcf_oc_schema_check(&entry); })),
        row("oc_check_required", "0", {"1"},
            with_entry(whole, [](text_entry& entry) { return oc_check_required(&entry, "person"); })),
        row("oc_check_allowed", "0", {"1"},
            with_entry(whole,
                       [](text_entry& entry) {
                           return oc_check_allowed("cert;binary", entry.e_objectclass_attr->a_vals, "cn=x");
                       })),
        row("oc_attr_type_cmp", "0", {"1"}, [] { return tell(oc_attr_type_cmp("cert", "cert;binary")); }),
        row("check_dn_in_attr", "0", {"90"},
            with_entry("owner: cn=a|owner: cn=b",
                       [](text_entry& entry) { return check_dn_in_attr(nullptr, entry.find("owner")); })),
        row("ldcf_api_schema2entry", [&] { return tell_made(ldcf_api_schema2entry(&schema), entry_free); }),
        row("attributeTypesContainsAttr", "1", {"0"},
            [&] {
                static char definition[] = "( 1.2 NAME 'x' )";
                static char name[] = "x";
                char* list[] = {definition, nullptr};
                return tell(attributeTypesContainsAttr(list, name));
            }),
    });
}

TEST_F(SchemaCallsAlloc, DifferencesAreNullOrAFailure)
{
    ldcf_schema proposed;
    proposed.copy(*ldcf_schema_g);
    ldcf_schema_proposed_g = &proposed;
    auto changed = parsed<ldcf_objclass>("( 8.1 NAME 'person' SUP top MUST sn MAY ( cn $ note ) )");
    ldcf_find(proposed.object_classes, "person")->incomplete();
    proposed.replace(changed);
    const ldcf_objclass& active = ldcf_api_get_objclass_from_schema_g("person");
    expect_outcomes({
        row("ldcf_api_get_diff_info", "6", {"-1"},
            [&] {
                const std::unique_ptr<ldcf_diff_info, heap_free> info(ldcf_api_get_diff_info(active));
                ldcf_api_list_diff_info_delete(info != nullptr ? info->list : nullptr);
                return tell(info != nullptr ? info->count : -1);
            }),
        row("ldcf_api_compare_SUP", "0", {"-1"}, [&] { return tell(ldcf_api_compare_SUP(active)); }),
    });
    ldcf_schema_proposed_g = nullptr;
}

#endif

}  // namespace
