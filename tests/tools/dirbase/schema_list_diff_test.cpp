// dirbase schema list and diff: attribute types by property, and what one directory says that another doesn't.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using tool_test::lines_of;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::tool_run;

TEST(SchemaList, EachPropertyAndItsOppositeCoverTheSchema)
{
    const schema_copy schema;
    const auto names = [&](const std::string& property) {
        const tool_run run = schema.run("list", {property});
        EXPECT_EQ(run.status, 0) << run.err;
        std::vector<std::string> lines = lines_of(run.out);
        std::sort(lines.begin(), lines.end());
        return lines;
    };
    const auto checked = nlohmann::json::parse(schema.run("check", {"--json"}).out);
    const std::size_t all = checked["attributeTypes"];
    for (const char* property : {"langtag", "attrcache", "config", "operational", "encryptable", "encrypted"}) {
        const std::vector<std::string> some = names(property);
        const std::vector<std::string> others = names("non" + std::string(property));
        EXPECT_EQ(some.size() + others.size(), all) << property;
        std::vector<std::string> both;
        std::set_intersection(some.begin(), some.end(), others.begin(), others.end(), std::back_inserter(both));
        EXPECT_THAT(both, ElementsAre()) << property;
    }
    EXPECT_THAT(names("nonunique"), Contains("cn"));
    EXPECT_THAT(names("unique"), Contains("uid"));
    const auto shown = nlohmann::json::parse(schema.run("list", {"encryptable", "--json"}).out);
    EXPECT_EQ(shown["attributeTypes"].size(), names("encryptable").size());
    EXPECT_EQ(schema.run("list", {"pretty"}).status, 2);
}

TEST(SchemaDiff, TellsWhatIsNewGoneAndChangedAndWhatThatMeansForClasses)
{
    const schema_copy before;
    before.write_schema("V3.additions",
                        "attributeTypes { ( 1.2.1 NAME 'here' SUP name ) ( 1.2.2 NAME 'both' SUP name ) }\n"
                        "objectClasses { ( 1.2.10 NAME 'base' SUP top ABSTRACT MUST here MAY cn )\n"
                        "  ( 1.2.11 NAME 'derived' SUP base ) ( 1.2.12 NAME 'leaf' SUP derived ) }");
    const schema_copy after;
    after.write_schema(
        "V3.additions",
        "attributeTypes { ( 1.2.2 NAME 'both' SUP name SINGLE-VALUE ) ( 1.2.3 NAME 'there' SUP name ) }\n"
        "XANattributeTypes:( both LENGTH 7 )\n"
        "objectClasses { ( 1.2.10 NAME 'base' SUP top AUXILIARY MUST ( cn $ there ) )\n"
        "  ( 1.2.11 NAME 'derived' SUP top ) ( 1.2.12 NAME 'leaf' SUP derived ) }");
    const tool_run run = run_tool({"schema", "diff", before.folder(), after.folder()});
    EXPECT_EQ(run.status, 1) << run.err;
    EXPECT_THAT(
        lines_of(run.out),
        ElementsAre("attribute type here: gone", "  - ( 1.2.1 NAME 'here' SUP name )", "attribute type both: changed",
                    "  - ( 1.2.2 NAME 'both' SUP name )", "  + ( 1.2.2 NAME 'both' SUP name SINGLE-VALUE )",
                    "  + ( 1.2.2 LENGTH 7 )", "attribute type there: new", "  + ( 1.2.3 NAME 'there' SUP name )",
                    "object class base: changed", "  - ( 1.2.10 NAME 'base' SUP top ABSTRACT MUST here MAY cn )",
                    "  + ( 1.2.10 NAME 'base' SUP top AUXILIARY MUST ( cn $ there ) )", "  kind: ABSTRACT to AUXILIARY",
                    "  no longer MUST: here", "  newly MUST: there", "  from MAY to MUST: cn",
                    "object class derived: changed", "  - ( 1.2.11 NAME 'derived' SUP base STRUCTURAL )",
                    "  + ( 1.2.11 NAME 'derived' SUP top STRUCTURAL )", "  superiors: base, top to top",
                    "object class leaf: changed", "  superiors: base, derived, top to derived, top"));

    const auto shown =
        nlohmann::json::parse(run_tool({"schema", "diff", "--json", before.folder(), after.folder()}).out);
    EXPECT_EQ(shown["ok"], false);
    EXPECT_EQ(shown["differences"][3]["classKind"]["after"], "AUXILIARY");
    EXPECT_EQ(shown["differences"][3]["attributes"].size(), 3u);
    EXPECT_EQ(shown["differences"][0]["difference"], "gone");
}

TEST(SchemaDiff, AModifiedCopyDiffersByWhatWasModifiedAndTheOriginalByNothing)
{
    const schema_copy original;
    const schema_copy changed;
    const std::string addition = changed.write("new.at", "attributeTypes:( 1.2.3 NAME 'fresh' SUP name )");
    EXPECT_EQ(changed.run("modify", {"add", addition}).status, 0);
    const tool_run run = run_tool({"schema", "diff", original.folder(), changed.folder()});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.out, "attribute type fresh: new\n  + ( 1.2.3 NAME 'fresh' SUP name )\n");
    const tool_run none = run_tool({"schema", "diff", original.folder(), original.folder()});
    EXPECT_EQ(none.status, 0);
    EXPECT_EQ(none.out, "");
    const tool_run missing = run_tool({"schema", "diff", original.folder(), original.path("nowhere")});
    EXPECT_EQ(missing.status, 2);
    EXPECT_THAT(missing.err, HasSubstr("nowhere/schema.list: No such file"));
}
