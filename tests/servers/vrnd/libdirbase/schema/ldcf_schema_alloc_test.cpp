// The schema engine with every allocation failing in turn: one class of exception, nothing lost, the active schema and
// its files unchanged.
#include <functional>
#include <optional>

#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/expect_clean.h"
#include "tests/support/temp_dir.h"

using schema_test::content_of;
using schema_test::described;
using schema_test::parsed;
using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::expect_clean;
using test_support::for_each_failing_allocation;

namespace {

// A schema with all of the grammar, and without the required definitions.
const std::string tiny_text =
    "ldapSyntaxes { ( " ARC "15 DESC 'Text' ) ( " ARC "38 ) } matchingRules { ( 2.5.13.0 SYNTAX " ARC "38 )\n"
    "( 2.5.13.2 NAME 'caseIgnoreMatch' DESC 'd' SYNTAX '" ARC "15' )\n"
    "( 2.5.13.4 NAME ( 'caseIgnoreSubstringsMatch' 'another' ) SYNTAX " ARC "15 ) }\n" +
    std::string(schema_test::small_text) +
    "attributeTypes:( 9.3 NAME 'alternate' SUP name ) attributeTypes:( 9.6 NAME 'quoted' SYNTAX '" ARC "15{8}' )";

}  // namespace

TEST(LdcfSchemaAlloc, ParsingFailsCleanlyAtEveryPoint)
{
    EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                  ldcf_schema schema;
                  expect_clean([&] { schema.parse_str(tiny_text.c_str(), "test"); });
                  const alloc_fault_pause pause;
                  EXPECT_NE(described(schema), "");  // every key leads to a body, and what is there prints
              }),
              100u);
}

TEST(LdcfSchemaAlloc, AFailedCompletionCanBeUndoneAndTriedAgain)
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

TEST(LdcfSchemaAlloc, ChangesOfACopyFailCleanlyAndLeaveTheOriginal)
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

namespace {

// The active schema, loaded from two files; empty again when the object goes.
class active_schema {
public:
    active_schema()
    {
        ldcf_schema_g->parse(dir.write("required", schema_test::required_text()).c_str());
        ldcf_schema_g->parse(dir.write("home", schema_test::small_text).c_str());
        ldcf_schema_g->complete();
        ldcf_schema_g->complete_db_names();
        before_ = described(*ldcf_schema_g) + content_of(dir.path());
    }
    ~active_schema() { ldcf_schema_g->clear(); }

    void run(ldcf_modify_phase phase) { ldcf_schema_modify_attrtype(nullptr, ldcf_modify_replace, phase, changed_); }
    bool unchanged() const
    {
        return ldcf_schema_g == active_ && described(*ldcf_schema_g) + content_of(dir.path()) == before_;
    }

    const test_support::temp_dir dir;

private:
    const schema_test::relational_store store_;
    const ldcf_schema* active_ = ldcf_schema_g;
    ldcf_attrtype changed_ = parsed<ldcf_attrtype>("( 9.5 NAME 'spare' DESC 'new' SUP cn )");
    std::string before_;
};

}  // namespace

TEST(LdcfSchemaAlloc, AVoteThatFailsLeavesTheActiveSchemaAndItsFiles)
{
    active_schema schema;
    EXPECT_GT(for_each_failing_allocation([&](std::size_t point) {
                  expect_clean([&] { schema.run(ldcf_modify_vote); });
                  const alloc_fault_pause pause;
                  schema.run(ldcf_modify_cleanup);
                  EXPECT_TRUE(schema.unchanged()) << point;
                  EXPECT_EQ(described(*ldcf_schema_proposed_g), schema_test::nothing);
              }),
              300u);
}

TEST(LdcfSchemaAlloc, ACommitThatFailsLeavesTheActiveSchemaAndItsFiles)
{
    EXPECT_GT(for_each_failing_allocation([&](std::size_t point) {
                  std::optional<alloc_fault_pause> pause(std::in_place);
                  active_schema schema;
                  schema.run(ldcf_modify_vote);
                  pause.reset();
                  expect_clean([&] { schema.run(ldcf_modify_commit); });
                  pause.emplace();
                  schema.run(ldcf_modify_cleanup);
                  EXPECT_EQ(schema.unchanged(), allocation_failed()) << point;
              }),
              3u);
}

TEST(LdcfSchemaAlloc, ACleanupThatFailsStillEmptiesTheSpareInstance)
{
    active_schema schema;
    EXPECT_GT(for_each_failing_allocation([&](std::size_t point) {
                  std::optional<alloc_fault_pause> pause(std::in_place);
                  schema.run(ldcf_modify_vote);
                  pause.reset();
                  expect_clean([&] { schema.run(ldcf_modify_cleanup); });
                  pause.emplace();
                  EXPECT_EQ(described(*ldcf_schema_proposed_g), schema_test::nothing);
                  std::filesystem::remove(schema.dir.path("home.tmp"));
                  EXPECT_TRUE(schema.unchanged()) << point;
              }),
              0u);
}
