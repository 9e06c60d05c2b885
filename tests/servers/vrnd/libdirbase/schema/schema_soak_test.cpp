// Readers and one writer at the schema for a while: the writer takes the active schema to and fro between two, the
// plain and the extended one, on real files, and whatever readers ask, all answers of one turn under the read side of
// the schema lock are those of one of the two.
//
// It runs for a short time, longer under ThreadSanitizer, and for as many seconds as DIRBASE_SOAK_SECONDS says.
#include <array>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <thread>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"
#include "tests/support/temp_dir.h"

namespace {

constexpr std::size_t reader_count = 4;

#ifdef __SANITIZE_THREAD__
constexpr int default_seconds = 10;
#else
constexpr int default_seconds = 2;
#endif

// The plain schema. In the extended one `tone` is compared without regard to case, and there are the type `extra` and
// the class `extraThing` that needs it.
constexpr char plain_text[] =
    "attributeTypes { ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX " ARC "38 )\n"
    "( 2.5.4.41 NAME 'name'" IGNORE_CASE "( 2.5.4.3 NAME ( 'cn' 'commonName' ) SUP name )\n"
    "( 9.1 NAME 'tone' EQUALITY caseExactMatch SYNTAX " ARC "15 ) }\n"
    "objectClasses { ( 2.5.6.0 NAME 'top' ABSTRACT MUST objectClass )\n"
    "( 8.1 NAME 'thing' SUP top STRUCTURAL MUST cn MAY tone ) }\n";
constexpr char exact_tone[] = "( 9.1 NAME 'tone' EQUALITY caseExactMatch SYNTAX " ARC "15 )";
constexpr char loose_tone[] = "( 9.1 NAME 'tone' EQUALITY caseIgnoreMatch SYNTAX " ARC "15 )";
constexpr char extra_type[] = "( 9.2 NAME ( 'extra' 'additional' ) SUP name )";
constexpr char extra_class[] = "( 8.2 NAME 'extraThing' SUP thing STRUCTURAL MUST extra )";

constexpr char plain_entry[] =
    "dn: tone=a,cn=b\nobjectClass: top\nobjectClass: thing\ncn: b\ntone: A\ntone: a\ntone: B\n";
constexpr char extra_entry[] =
    "dn: extra=A,cn=b\nobjectClass: top\nobjectClass: thing\nobjectClass: extraThing\ncn: b\nextra: A\nADDITIONAL: a\n";

// What one turn of a reader has to see.
constexpr char plain_answers[] =
    "extra - 9.2 - oid.9.2 - Additional;lang-en -\n"
    "tone tone,9.1 OID.9.1 tone,9.1 cn cn,commonName,2.5.4.3 oid - class -\n"
    "objectClass,cn,name,tone\n"
    "tone = a , 2.5.4.3=b: 0 tone=a,cn=b TONE=a,CN=B|extra=a: 17\n"
    "tone=A|a|B tree A|B|a norm TONE=a,CN=B\n"
    "plain 0, 0; extra 65, 65\n"
    "(tone=A) 0 (tone=b) -1 (!(tone=b)) 0 (&(tone=*)(tone=B)) 0 (tone=b*) -1 (extra=a) none (|(extra=*)(tone=a)) 0\n";
constexpr char extended_answers[] =
    "extra extra,additional,9.2 9.2 extra,additional,9.2 oid.9.2 extra,additional,9.2"
    " Additional;lang-en extra,additional,9.2\n"
    "tone tone,9.1 OID.9.1 tone,9.1 cn cn,commonName,2.5.4.3 oid 9.2 class EXTRATHING,8.2\n"
    "objectClass,cn,name,tone,extra\n"
    "tone = a , 2.5.4.3=b: 0 tone=a,cn=b TONE=A,CN=B|extra=a: 0 extra=a EXTRA=A\n"
    "tone=A|B tree A|B norm TONE=A,CN=B\n"
    "plain 0, 0; extra 0, 0\n"
    "(tone=A) 0 (tone=b) 0 (!(tone=b)) -1 (&(tone=*)(tone=B)) 0 (tone=b*) 0 (extra=a) -1 (|(extra=*)(tone=a)) 0\n";

std::string names_of(char** names)
{
    std::string text;
    for (; names != nullptr && *names != nullptr; ++names) {
        text += (text.empty() ? "" : ",") + std::string(*names);
    }
    return text.empty() ? "-" : text;
}

// The names in a record; its definition must be the one that the active schema holds.
std::string looked_up(const char* name)
{
    char* base = nullptr;
    const asyntaxinfo* const info = ldcf_api_attr_get_info(name, &base);
    const heap_text owner(base);
    if (info == nullptr) {
        return std::string(name) + " -";
    }
    const ldcf_attrtype& active = ldcf_api_get_attrtype_from_schema_g(info->names[0]);
    return std::string(name) + " " + names_of(info->names) + (&*active == info->type ? "" : " stale");
}

std::string normalized(const char* text)
{
    ldap_escDN* dn = dn_normalize_esc(text);
    std::string told = std::string(text) + ": " + std::to_string(dn->result);
    if (dn->result == 0) {
        told += " " + std::string(GetDNString33(dn)) + " " + GetDNUpper33(dn);
    }
    free_ldap_escDN(&dn);
    return told;
}

entry_guard entry_of(const char* text)
{
    std::string copy = text;
    return entry_guard(str2entry(copy.data(), 1, 1));
}

// The result of a check by the classes of the active schema, with a sink that keeps nothing, and of the server's own.
std::string checked(Entry* entry)
{
    struct : ldcf_entry_sink {
        void report(const ldcf_entry_finding&) override {}
    } quiet;
    const int result = ldcf_check_entry(*ldcf_api_get_schema_g(), entry, ldcf_check_strict, false, nullptr, quiet);
    return std::to_string(ldcf_api_schema_check(entry, nullptr, false)) + ", " + std::to_string(result);
}

std::string tested(const Entry* entry, const char* text)
{
    const filter_guard filter(str2filter(text, 1));
    return std::string(text) + " " + (filter == nullptr ? "none" : std::to_string(test_filter(entry, filter.get())));
}

// All questions of one turn; the caller holds the read side of the schema lock.
std::string answers()
{
    std::string told;
    for (const char* name : {"extra", "9.2", "oid.9.2", "Additional;lang-en", "tone", "OID.9.1", "cn"}) {
        told += looked_up(name) + (name == std::string_view("Additional;lang-en") ? "\n" : " ");
    }
    const char* const oid = ldcf_api_attr_get_oid("additional");
    const objectclassinfo* const objclass = ldcf_api_objectclass_get_info("extraThing");
    told += std::string("oid ") + (oid == nullptr ? "-" : oid) + " class " +
            (objclass == nullptr ? "-" : names_of(objclass->names)) + "\n";
    char** const all = ldcf_api_get_nonconfig_attrs();
    told += names_of(all) + "\n";
    charray_free(all);
    told += normalized("tone = a , 2.5.4.3=b") + "|" + normalized("extra=a") + "\n";

    const entry_guard plain = entry_of(plain_entry);
    const entry_guard extra = entry_of(extra_entry);
    const Attribute* const tone = attr_find(plain.get(), "tone", 0, nullptr);
    told += "tone=" + model_test::joined(tone->a_vals) + " tree " + model_test::tree_of(tone) + " norm " +
            plain->e_norm_dn + "\n";
    told += "plain " + checked(plain.get()) + "; extra " + checked(extra.get()) + "\n";
    for (const char* filter : {"(tone=A)", "(tone=b)", "(!(tone=b))", "(&(tone=*)(tone=B))", "(tone=b*)", "(extra=a)",
                               "(|(extra=*)(tone=a))"}) {
        told += tested(plain.get(), filter) + (filter[2] == '(' && filter[1] == '|' ? "\n" : " ");
    }
    return told;
}

// Takes the write side, the read side, for as long as one lives.
struct for_writing {
    for_writing() { _rdbm_wr_lock(ldcf_api_get_modify_attr_info_lock_g()); }
    ~for_writing() { _rdbm_wr_unlock(ldcf_api_get_modify_attr_info_lock_g()); }
};
struct for_reading {
    for_reading() { _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g()); }
    ~for_reading() { _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g()); }
};

int modify(ldcf_modify_op op, ldcf_modify_phase phase, ldcf_attrtype& definition)
{
    return ldcf_schema_modify_attrtype(nullptr, op, phase, definition);
}
int modify(ldcf_modify_op op, ldcf_modify_phase phase, ldcf_objclass& definition)
{
    return ldcf_schema_modify_objclass(nullptr, op, phase, definition);
}

// One change through all phases, or one that is voted on and taken back.
template <typename T>
void change(ldcf_modify_op op, const char* text, ldcf_modify_phase decision = ldcf_modify_commit)
{
    T definition = schema_test::parsed<T>(text);
    EXPECT_EQ(modify(op, ldcf_modify_vote, definition), 0);
    EXPECT_EQ(modify(op, decision, definition), 0);
    EXPECT_EQ(modify(op, ldcf_modify_cleanup, definition), 0);
}

void extend()
{
    change<ldcf_attrtype>(ldcf_modify_add, extra_type);
    change<ldcf_objclass>(ldcf_modify_add, extra_class);
    change<ldcf_attrtype>(ldcf_modify_replace, loose_tone);
}

void reduce()
{
    change<ldcf_objclass>(ldcf_modify_delete, extra_class);
    change<ldcf_attrtype>(ldcf_modify_delete, extra_type);
    change<ldcf_attrtype>(ldcf_modify_replace, exact_tone);
}

// A delete that is refused, since a class uses the type, and one that nobody wants in the end.
void fail()
{
    ldcf_attrtype used = schema_test::parsed<ldcf_attrtype>("( 2.5.4.3 NAME 'cn' )");
    EXPECT_THROW(modify(ldcf_modify_delete, ldcf_modify_vote, used), exc_invalid_state_t);
    EXPECT_EQ(modify(ldcf_modify_delete, ldcf_modify_rollback, used), 0);
    EXPECT_EQ(modify(ldcf_modify_delete, ldcf_modify_cleanup, used), 0);
    change<ldcf_attrtype>(ldcf_modify_add, "( 9.3 NAME 'never' SUP name )", ldcf_modify_rollback);
}

std::chrono::seconds time_to_run()
{
    const char* const wanted = std::getenv("DIRBASE_SOAK_SECONDS");
    return std::chrono::seconds(wanted == nullptr ? default_seconds : std::atoi(wanted));
}

class SchemaSoak : public testing::Test {
protected:
    SchemaSoak()
    {
        set_message_sink([](void*, const message_record&) {}, nullptr);  // each faulty entry is told
        ldcf_api_schema_init();
        files_ = {folder_.write("required", schema_test::required_text()), folder_.write("home", plain_text)};
        load(*ldcf_schema_g);
        ldcf_api_load_attr_hash();
    }
    ~SchemaSoak() override
    {
        ldcf_schema_g->clear();
        set_message_sink(nullptr, nullptr);
    }

    void load(ldcf_schema& schema) const
    {
        for (const std::string& file : files_) {
            schema.parse(file.c_str());
        }
        schema.complete();
        schema.complete_db_names();
    }

    const schema_test::relational_store store_;
    const test_support::temp_dir folder_;
    std::vector<std::string> files_;
};

}  // namespace

TEST_F(SchemaSoak, ReadersSeeOneOfTwoSchemasAndEachSeesBoth)
{
    ASSERT_EQ(answers(), plain_answers);
    std::array<std::array<std::atomic<std::size_t>, 2>, reader_count> seen = {};  // turns, by the schema seen
    std::atomic<std::size_t> all_turns = 0;
    std::atomic<bool> stop = false;
    std::array<std::string, reader_count> wrong;
    std::vector<std::thread> readers;
    for (std::size_t i = 0; i < reader_count; ++i) {
        readers.emplace_back([&, i] {
            while (!stop && wrong[i].empty()) {
                std::string told;
                {
                    const for_reading side;
                    told = answers();
                }
                if (told == plain_answers || told == extended_answers) {
                    ++seen[i][told == extended_answers];
                } else {
                    wrong[i] = told;
                    stop = true;
                }
                ++all_turns;
            }
        });
    }

    const auto everyone_saw_both = [&] {
        return std::all_of(seen.begin(), seen.end(), [](const auto& s) { return s[0] != 0 && s[1] != 0; });
    };
    const auto end = std::chrono::steady_clock::now() + time_to_run();
    std::size_t changes = 0;
    while (!stop && (std::chrono::steady_clock::now() < end || !everyone_saw_both())) {
        {
            const for_writing side;
            if (changes % 5 == 4) {
                fail();
            }
            changes % 2 == 0 ? extend() : reduce();
            if (changes % 3 != 0) {  // else the readers find records by the maps
                ldcf_api_load_attr_hash();
            }
            ++changes;
        }
        for (const std::size_t turns = all_turns; all_turns < turns + reader_count && !stop;) {
            std::this_thread::yield();
        }
    }
    stop = true;
    for (std::thread& reader : readers) {
        reader.join();
    }

    for (const std::string& told : wrong) {
        EXPECT_EQ(told, "");
    }
    ldcf_schema from_files;  // what the last commit wrote is what is in force
    load(from_files);
    EXPECT_EQ(schema_test::described(*ldcf_schema_g), schema_test::described(from_files));
    RecordProperty("changes", static_cast<int>(changes));
    RecordProperty("turns", static_cast<int>(all_turns));
}
