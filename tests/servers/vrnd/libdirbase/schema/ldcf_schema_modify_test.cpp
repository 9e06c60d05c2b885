// A change of the active schema in its phases, on real files, with a failure at every point.
#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/temp_dir.h"

namespace fs = std::filesystem;
using schema_test::content_of;
using schema_test::described;
using schema_test::nothing;
using schema_test::parsed;
using schema_test::refused;

namespace {

int modify(int op, int phase, ldcf_syntax& definition)
{
    return ldcf_schema_modify_syntax(nullptr, ldcf_modify_op(op), ldcf_modify_phase(phase), definition);
}
int modify(int op, int phase, ldcf_matchrule& definition)
{
    return ldcf_schema_modify_matchrule(nullptr, ldcf_modify_op(op), ldcf_modify_phase(phase), definition);
}
int modify(int op, int phase, ldcf_attrtype& definition)
{
    return ldcf_schema_modify_attrtype(nullptr, ldcf_modify_op(op), ldcf_modify_phase(phase), definition);
}
int modify(int op, int phase, ldcf_objclass& definition)
{
    return ldcf_schema_modify_objclass(nullptr, ldcf_modify_op(op), ldcf_modify_phase(phase), definition);
}

constexpr int add = 1, erase = 2, replace = 3;
constexpr int vote = 0, commit = 1, rollback = 2, cleanup = 3;

// A type with a standard and an extended definition.
ldcf_attrtype extended_type(const std::string& standard, const std::string& extended)
{
    ldcf_schema request;
    request.parse_str(("attributeTypes:" + standard + "XANattributeTypes:" + extended).c_str(), "request");
    return request.attribute_types.begin()->second.clone();
}

// The active schema, loaded from three files: "required", "main", and the empty "zadditions", where new definitions go.
// The types of "main" have their extended definitions at home in "zadditions".
class SchemaModify : public testing::Test {
protected:
    SchemaModify()
    {
        files_ = {dir_.write("required", schema_test::required_text()), dir_.write("main", schema_test::small_text),
                  dir_.write("zadditions", "XANattributeTypes:( spare LENGTH 5 )")};
        load(*ldcf_schema_g);
    }
    ~SchemaModify() override { ldcf_schema_g->clear(); }

    void load(ldcf_schema& schema) const
    {
        for (const std::string& file : files_) {
            schema.parse(file.c_str());
        }
        schema.complete();
        schema.complete_db_names();
    }

    std::string on_disk() const { return content_of(dir_.path()); }
    std::string active() const { return described(*ldcf_schema_g); }
    std::string as_files_say() const
    {
        ldcf_schema fresh;
        load(fresh);
        return described(fresh);
    }

    // Goes through a change that works, by which the two instances exchange their roles.
    template <typename T>
    void change(int op, T definition)
    {
        ldcf_schema* const before = ldcf_schema_g;
        EXPECT_EQ(modify(op, vote, definition) + modify(op, commit, definition) + modify(op, cleanup, definition), 0);
        EXPECT_TRUE(ldcf_schema_g != before && ldcf_schema_g == ldcf_schema_proposed_g);
        EXPECT_EQ(described(*before), nothing);
        EXPECT_EQ(active(), as_files_say());
    }

    // Goes through rollback and cleanup, after which everything must be as it was.
    template <typename T>
    void expect_undone(int op, T& definition, const ldcf_schema* active_before, const std::string& before)
    {
        EXPECT_EQ(modify(op, rollback, definition) + modify(op, cleanup, definition), 0);
        EXPECT_EQ(ldcf_schema_g, active_before);
        EXPECT_EQ(active() + on_disk(), before);
        EXPECT_EQ(described(*ldcf_schema_proposed_g), nothing);
    }

    const schema_test::relational_store store_;
    const test_support::temp_dir dir_;
    std::vector<std::string> files_;
};

}  // namespace

TEST_F(SchemaModify, AnAddedTypeTakesEffectAtTheCommitAndNotBefore)
{
    const std::string before = active(), files = on_disk();
    ldcf_schema* const first = ldcf_schema_g;
    ldcf_attrtype added = parsed<ldcf_attrtype>("( 9.9 NAME ( 'new' 'newer' ) SUP name )");
    ASSERT_EQ(modify(add, vote, added), 0);
    ldcf_schema* const second = ldcf_schema_proposed_g;
    EXPECT_TRUE(ldcf_schema_g == first && second != first && second->attribute_types["newer"] == added);
    EXPECT_EQ(active(), before);
    const std::string written = dir_.read("zadditions.tmp");
    EXPECT_NE(written.find("\n( 9.9 NAME ( 'new' 'newer' ) SUP name )\n"), written.npos);
    fs::remove(dir_.path("zadditions.tmp"));
    EXPECT_EQ(on_disk(), files);
    dir_.write("zadditions.tmp", written);

    ASSERT_EQ(modify(add, commit, added), 0);
    EXPECT_EQ(ldcf_schema_g, second);
    EXPECT_EQ(described(*first), before);  // for readers that are still at it
    EXPECT_EQ(on_disk(), "main:\n" + std::string(schema_test::small_text) + "required:\n" +
                             schema_test::required_text() + "zadditions:\n" + written);
    EXPECT_EQ(active(), as_files_say());
    ASSERT_EQ(modify(add, cleanup, added), 0);
    EXPECT_EQ(described(*first), nothing);
    EXPECT_EQ(active(), as_files_say());
    change(erase, parsed<ldcf_attrtype>("( 9.5 NAME 'spare' )"));
    EXPECT_EQ(ldcf_schema_g, first);  // the second change went back into the first instance
}

TEST_F(SchemaModify, ChangesOfAllKindsEndUpInTheirHomeFiles)
{
    change(add, parsed<ldcf_syntax>("( 5.5 DESC 'own' )"));
    change(add, parsed<ldcf_matchrule>("( 5.6 NAME 'ownMatch' SYNTAX 5.5 )"));
    change(add, extended_type("( 9.9 NAME 'own' EQUALITY ownMatch SYNTAX 5.5 )", "( own DBNAME 'o' SUBSTR )"));
    change(add, parsed<ldcf_objclass>("( 8.9 NAME 'ownClass' SUP employee MUST own )"));
    EXPECT_EQ(dir_.read("main"), schema_test::small_text);
    change(replace, parsed<ldcf_objclass>("( 8.3 NAME ( 'employee' 'worker' ) SUP person MUST sn MAY own )"));
    EXPECT_NE(dir_.read("main").find("MUST sn MAY own"), std::string::npos);
    EXPECT_EQ(dir_.read("required"), schema_test::required_text());
    change(replace, parsed<ldcf_syntax>("( " ARC "15 DESC 'changed' )"));
    EXPECT_NE(dir_.read("required").find("DESC 'changed'"), std::string::npos);
    change(replace, parsed<ldcf_objclass>("( 8.3 NAME 'employee' SUP person )"));
    change(erase, parsed<ldcf_objclass>("( 8.9 )"));
    change(erase, parsed<ldcf_attrtype>("( 9.9 )"));
    change(erase, parsed<ldcf_matchrule>("( 5.6 SYNTAX 5.5 )"));
    change(erase, parsed<ldcf_syntax>("( 5.5 )"));
}

TEST_F(SchemaModify, AVoteThatFailsAnywhereChangesNothing)
{
    const ldcf_schema* const instance = ldcf_schema_g;
    const std::string before = active() + on_disk();
    const auto expect_refused = [&](int op, auto definition, const std::string& start) {
        const std::string fault = refused([&] { modify(op, vote, definition); });
        EXPECT_EQ(fault.substr(0, start.size()), start) << fault;
        expect_undone(op, definition, instance, before);
    };
    expect_refused(add, parsed<ldcf_syntax>("( " ARC "15 )"), "exc_ldap_rc_t(20) -31");
    expect_refused(add, parsed<ldcf_attrtype>("( 7 NAME 'x' SUP nil )"), "exc_invalid_input_t -25");
    expect_refused(add, parsed<ldcf_attrtype>("( 7 NAME 'x' SUP x )"), "exc_invalid_input_t -35");
    expect_refused(add, extended_type("( 7 NAME 'x' SUP name )", "( 7 DBNAME 'a-b' )"),
                   "exc_invalid_input_t 0: Hyphen");
    expect_refused(add, parsed<ldcf_objclass>("( 7 NAME 'x' MUST nil )"), "exc_invalid_input_t -25");
    expect_refused(erase, parsed<ldcf_attrtype>("( 9.2 )"), "exc_invalid_state_t -32");
    expect_refused(erase, parsed<ldcf_objclass>("( 8.2 )"), "exc_invalid_state_t -32");
    expect_refused(erase, parsed<ldcf_syntax>("( 1.3.77.0.2.8.1 )"), "exc_does_not_exist_t -37");
    expect_refused(erase, parsed<ldcf_matchrule>("( 2.5.13.24 SYNTAX 5 )"), "exc_does_not_exist_t -37");
    expect_refused(replace, parsed<ldcf_attrtype>("( 9.2 NAME 'name' )"), "exc_invalid_input_t -28");
    expect_refused(replace, parsed<ldcf_objclass>("( 8.1 NAME 'top' SUP person )"), "exc_invalid_input_t -36");
    expect_refused(replace, parsed<ldcf_matchrule>("( 2.5.13.5 NAME 'x' SYNTAX " ARC "15 )"),
                   "exc_invalid_state_t -38");
    expect_refused(
        4, parsed<ldcf_syntax>("( 5 )"),
        "exc_invalid_parameter_t -24: invalid op value; Expected one of the following operation: add, delete, "
        "replace");
    change(add, parsed<ldcf_syntax>("( 5.5 )"));
}

TEST_F(SchemaModify, FilesThatCannotBeWrittenOrReplacedFailTheChangeAndNothingElse)
{
    const ldcf_schema* const instance = ldcf_schema_g;
    const std::string before = active() + on_disk();
    ldcf_attrtype type = extended_type("( 9.5 NAME 'spare' DESC 'd' SUP name )", "( 9.5 NONMATCHABLE )");
    for (const char* file : {"main.tmp", "zadditions.tmp"}) {  // the first and the second of two
        SCOPED_TRACE(file);
        fs::create_directory(dir_.path(file));
        EXPECT_NE(refused([&] { modify(replace, vote, type); }), "");
        fs::remove(dir_.path(file));
        expect_undone(replace, type, instance, before);  // one temporary file is missing, or both

        ASSERT_EQ(modify(replace, vote, type), 0);
        fs::remove(dir_.path(file));
        const test_support::message_catcher log;
        EXPECT_THROW(modify(replace, commit, type), exc_does_not_exist_t);
        EXPECT_EQ(log.count(), 0u);  // the protection hasn't changed
        expect_undone(replace, type, instance, before);
    }
    // What still stands in the way at the cleanup doesn't keep it from the rest.
    fs::create_directory(dir_.path("main.tmp"));
    EXPECT_NE(refused([&] { modify(replace, vote, type); }), "");
    dir_.write("zadditions.tmp", "from before");
    refused([&] { modify(replace, cleanup, type); });
    EXPECT_EQ(described(*ldcf_schema_proposed_g), nothing);
    fs::remove(dir_.path("main.tmp"));
    EXPECT_EQ(active() + on_disk(), before);
}

TEST_F(SchemaModify, RollbackAndCleanupLeaveNothingBehind)
{
    const ldcf_schema* const instance = ldcf_schema_g;
    const std::string before = active() + on_disk();
    ldcf_syntax syntax = parsed<ldcf_syntax>("( 5.5 )");
    EXPECT_EQ(modify(add, rollback, syntax) + modify(add, cleanup, syntax), 0);  // without a vote
    ASSERT_EQ(modify(add, vote, syntax), 0);
    EXPECT_TRUE(fs::exists(dir_.path("zadditions.tmp")));
    expect_undone(add, syntax, instance, before);
    const test_support::debug_catcher debug(0xffffffffu);
    EXPECT_EQ(modify(add, 4, syntax), -1);
    EXPECT_TRUE(debug.has("invalid phase value(4)"));
    EXPECT_EQ(active() + on_disk(), before);
}

TEST_F(SchemaModify, OtherFilesInTheFolderAreNoneOfItsBusiness)
{
    const std::string old = dir_.write("zadditions.old", "a copy that the administrator keeps");
    change(add, parsed<ldcf_syntax>("( 5.5 )"));
    EXPECT_TRUE(fs::exists(old) && test_support::file_text(old) == "a copy that the administrator keeps");
}

TEST_F(SchemaModify, AChangeOfProtectionIsToldAfterTheCommit)
{
    // What the log says of a change, phase by phase.
    const auto told = [&](int op, ldcf_attrtype type) {
        std::string text;
        for (const int phase : {vote, commit, cleanup}) {
            const test_support::message_catcher log;
            EXPECT_EQ(modify(op, phase, type), 0);
            for (const test_support::caught_message& message : log.messages()) {
                EXPECT_TRUE(phase == commit && message.component == 4 && message.severity == 2 && message.id == 45);
                text += message.arguments[0] + ": " + message.arguments[1];
            }
        }
        return text;
    };
    const std::pair<const char*, const char*> cases[] = {
        // each a change of the one before
        {"LENGTH 5", ""},
        {"ENCRYPT AES-128", "spare: ENCRYPT=AES-128 "},
        {"ENCRYPT AES-128 DBNAME 's'", ""},
        {"ENCRYPT AES-192 NONMATCHABLE", "spare: ENCRYPT=AES-192 NONMATCHABLE=true "},
        {"ENCRYPT AES-256 NONMATCHABLE RETURN-VALUE encrypted", "spare: ENCRYPT=AES-256 RETURN-VALUE=encrypted "},
        {"ENCRYPT SSHA RETURN-VALUE type-only SECURE-CONNECTION-REQUIRED",
         "spare: ENCRYPT=SSHA RETURN-VALUE=type-only SECURE-CONNECTION-REQUIRED=true NONMATCHABLE=false "},
        {"", "spare: ENCRYPT=none RETURN-VALUE=cleartext SECURE-CONNECTION-REQUIRED=false "},
    };
    for (const auto& [extended, text] : cases) {
        EXPECT_EQ(
            told(replace, extended_type("( 9.5 NAME 'spare' SUP name )", "( 9.5 " + std::string(extended) + " )")),
            text);
    }
    // A new type is no change; one under a new name is, since nothing is known of that.
    EXPECT_EQ(told(add, extended_type("( 9.9 NAME 'new' SUP name )", "( 9.9 ENCRYPT SSHA )")), "");
    EXPECT_EQ(told(replace, parsed<ldcf_attrtype>("( 9.5 NAME 'renamed' SUP name )")), "renamed: ENCRYPT=none ");
}
