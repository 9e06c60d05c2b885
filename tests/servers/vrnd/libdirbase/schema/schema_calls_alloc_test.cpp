// The schema interface call by call, the phases of a change for the three kinds beside attribute types, and the
// recovery of files, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that makes the records

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libcsgl/csgl_file.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"
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

void forget(const char* name)
{
    const alloc_fault_pause pause;
    ldcf_api_attrtype_reset_info(name);
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
        expect_outcomes({{name, [call = call] { return tell_names(call()); }, whole, {"-1"}}});
    }
}

TEST_F(SchemaCallsAlloc, RecordsAreMadeOrNullAndMadeBySomebodyElse)
{
    ldcf_schema proposed;
    proposed.copy(*ldcf_schema_g);
    ldcf_schema_proposed_g = &proposed;
    const auto& types = ldcf_schema_g->attribute_types;
    const auto& classes = ldcf_schema_g->object_classes;
    const auto record = [](auto look_up) {
        return [=] {
            forget("note");
            const calm_text told = tell(look_up() != nullptr);
            forget("note");
            return told;
        };
    };
    expect_outcomes({
        {"ldcf_attrtype_get_info", record([&] { return ldcf_attrtype_get_info(types, "note"); }), "1", {"0"}},
        {"ldcf_attrtype_get_info_based_on_table",
         record([&] { return ldcf_attrtype_get_info_based_on_table(types, "NOTE"); }),
         "1",
         {"0"}},
        {"ldcf_api_attr_get_info_based_on_table",
         record([] { return ldcf_api_attr_get_info_based_on_table("note"); }),
         "1",
         {"0"}},
        {"ldcf_api_attr_get_info_from_proposed_schema",
         [] {
             const bool made = ldcf_api_attr_get_info_from_proposed_schema("note") != nullptr;
             calm([] { ldcf_api_get_attrtype_from_proposed_schema_g("note").reset_info(); });
             return tell(made);
         },
         "1",
         {"0"}},
        {"ldcf_api_attrtype_apply",
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
         },
         "0 all",
         {"80 some"}},
        {"ldcf_hash_put",
         [] {
             asyntaxinfo info = {};
             ldcf_hash_flush();
             ldcf_hash_put("x", &info);
             const calm_text told = tell(ldcf_hash_get("X") != nullptr);
             ldcf_hash_flush();
             return told;
         },
         "1",
         {"0"}},
        {"ldcf_api_list_diff_info_new",
         [] {
             return tell_made(ldcf_api_list_diff_info_new("1.2", attr_diff_newly_may), ldcf_api_list_diff_info_delete);
         },
         "made",
         {"(null)"}},
    });
    // Records of classes stay with them, so each run needs a class of its own.
    for_each_failing_allocation([&](std::size_t) {
        ldcf_schema fresh;
        calm([&] { fresh.copy(*ldcf_schema_g); });
        const objectclassinfo* const info = ldcf_objectclass_get_info(fresh.object_classes, "person");
        EXPECT_EQ(info == nullptr, allocation_failed());
        calm([&] { fresh.clear(); });
    });
    EXPECT_NE(ldcf_objectclass_get_info(classes, "person"), nullptr);
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
        {"ldcf_api_schema_parse",
         [&] {
             calm([&] { reload(0); });
             const int result = ldcf_api_schema_parse(file.c_str());
             calm([&] {
                 EXPECT_EQ(ldcf_schema_g->files.empty(), result != 0);
                 reload(0);
             });
             return tell(result);
         },
         "0",
         {"1"}},
        {"ldcf_api_schema_complete",
         [&] {
             calm([&] { EXPECT_EQ(reload(1), 0); });
             const int result = ldcf_api_schema_complete();
             calm([&] { reload(0); });
             return tell(result);
         },
         "0",
         {"1"}},
        // Without memory the cache of names stays empty, which is no failure.
        {"ldcf_api_schema_complete_db_names",
         [&] {
             calm([&] { EXPECT_EQ(reload(2), 0); });
             const int result = ldcf_api_schema_complete_db_names();
             calm([&] { reload(0); });
             return tell(result);
         },
         "0",
         {"1", "0"}},
    });
}

TEST_F(SchemaCallsAlloc, ChecksOfAnEntry)
{
    struct : ldcf_entry_sink {
        void report(const ldcf_entry_finding&) override {}
    } quiet;
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
        {"ldcf_check_entry",
         with_entry("dn: cn=x|objectClass: person|cn: x|sn: y|cert;binary: a|owner: cn=a",
                    [&](text_entry& entry) {
                        return ldcf_check_entry(*ldcf_schema_g, &entry, ldcf_check_strict, false, nullptr, quiet);
                    }),
         "0",
         {"0", "90", "raised"}},
        {"check_dn_in_attr",
         with_entry("owner: cn=a|owner: cn=b",
                    [](text_entry& entry) { return check_dn_in_attr(nullptr, entry.find("owner")); }),
         "0",
         {"90"}},
        {"attributeTypesContainsAttr",
         [&] {
             static char definition[] = "( 1.2 NAME 'x' )";
             static char name[] = "x";
             char* list[] = {definition, nullptr};
             return tell(attributeTypesContainsAttr(list, name));
         },
         "1",
         {"0"}},
    });
}

// What raises: one class of exception for memory, nothing lost.
TEST_F(SchemaCallsAlloc, TextsAndFilesOfTheFoundationRaiseOneException)
{
    const temp_dir folder;
    const std::string path = folder.write("file", "text");
    const std::string other = folder.path("other");
    const csgl_string name("a name that is too long to be kept inside of a body without a block");
    const ldcf_names names = {"a", "b"};
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
        {"csgl_message", [] { csgl_message("[p[a]p] b", 0, __FILE__, 1); }},
        {"ldcf_recovery",
         [&] {
             const csgl_vector<csgl_string> files = {path.c_str()};
             const ldcf_recovery recovery(files);
             recovery.concerned();
             recovery.source_of(files[0]);
         }},
    };
    for (const auto& [what, action] : actions) {
        SCOPED_TRACE(what);
        for_each_failing_allocation([&](std::size_t) { expect_clean(action); });
        EXPECT_EQ(folder.read("file"), "text");
    }
    const auto read = [](const char* text, auto reader) {
        return [=] {
            ldcf_token_factory factory(text, "test");
            reader(factory);
        };
    };
    const std::pair<const char*, std::function<void()>> readers[] = {
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
    for (const auto& [what, action] : readers) {
        SCOPED_TRACE(what);
        for_each_failing_allocation([&](std::size_t) { expect_clean(action); });
    }
}

// The active schema on two files.
class schema_on_files {
public:
    schema_on_files()
    {
        ldcf_schema_g->clear();
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

// A vote and a commit that fail leave everything as it was, and the change can be made afterwards.
template <typename T, typename Modify>
void expect_change_survives(const char* text, ldcf_modify_op op, const Modify& modify)
{
    const auto run = [&](T& definition, ldcf_modify_phase phase) { modify(nullptr, op, phase, definition); };
    const schema_on_files schema;
    for_each_failing_allocation([&](std::size_t) {
        std::optional<alloc_fault_pause> pause(std::in_place);
        {
            T definition = parsed<T>(text);
            pause.reset();
            expect_clean([&] { run(definition, ldcf_modify_vote); });
            pause.emplace();
            run(definition, ldcf_modify_cleanup);
        }
        EXPECT_TRUE(schema.unchanged());
    });
    for_each_failing_allocation([&](std::size_t) {
        std::optional<alloc_fault_pause> pause(std::in_place);
        {
            const schema_on_files fresh;
            T definition = parsed<T>(text);
            run(definition, ldcf_modify_vote);
            pause.reset();
            expect_clean([&] { run(definition, ldcf_modify_commit); });
            pause.emplace();
            run(definition, ldcf_modify_cleanup);
            EXPECT_EQ(fresh.unchanged(), allocation_failed());
            if (allocation_failed()) {
                T again = parsed<T>(text);
                run(again, ldcf_modify_vote);
                run(again, ldcf_modify_commit);
                run(again, ldcf_modify_cleanup);
                EXPECT_FALSE(fresh.unchanged());
            }
        }
    });
}

TEST(SchemaChangeCallsAlloc, EachKindOfDefinitionIsChangedWhollyOrNotAtAll)
{
    expect_change_survives<ldcf_syntax>("( 5.5 DESC 'new' )", ldcf_modify_add, ldcf_schema_modify_syntax);
    expect_change_survives<ldcf_matchrule>("( 5.6 NAME 'newRule' SYNTAX " ARC "15 )", ldcf_modify_add,
                                           ldcf_schema_modify_matchrule);
    expect_change_survives<ldcf_objclass>("( 8.3 NAME 'worker' )", ldcf_modify_delete, ldcf_schema_modify_objclass);
}

TEST(SchemaChangeCallsAlloc, ARecoveryWithoutMemoryCanBeTriedAgain)
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

}  // namespace

#endif
