// What an interrupted change has left, as a server meets it: at its start, and ahead of its own next change. What a
// process that is killed really leaves is tried out with the tool (schema_crash_test.cpp).
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"

#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/temp_dir.h"

namespace fs = std::filesystem;
using schema_test::content_of;

namespace {

class SchemaRecover : public testing::Test {
protected:
    csgl_vector<csgl_string> paths(const std::vector<std::string>& names) const
    {
        csgl_vector<csgl_string> all;
        for (const std::string& name : names) {
            all.emplace_back(dir_.path(name).c_str());
        }
        return all;
    }

    // Recovers the files "a" and "b"; gives the result and what then stands in the folder.
    std::string recovered() const
    {
        const std::string a = dir_.path("a"), b = dir_.path("b");
        const char* const files[] = {a.c_str(), b.c_str()};
        const int result = ldcf_recover_files(files, 2);
        return std::to_string(result) + " " + content_of(dir_.path());
    }

    // True when a text of the log holds these words.
    bool told(const std::string& words) const
    {
        const std::vector<std::string> texts = log_.texts();
        return std::any_of(texts.begin(), texts.end(),
                           [&](const std::string& text) { return text.find(words) != text.npos; });
    }

    const test_support::temp_dir dir_;
    test_support::debug_catcher log_;
};

}  // namespace

TEST_F(SchemaRecover, AServerIsToldAtItsStartWhetherItCanLoad)
{
    dir_.write("a", "1");
    dir_.write("b", "2");
    EXPECT_EQ(recovered(), "0 a:\n1b:\n2");
    EXPECT_EQ(log_.count(), 0u);  // nothing was interrupted, nothing to say

    dir_.write("a", "new");
    dir_.write("a.tmp.old", "1");
    dir_.write("b.tmp", "new");
    EXPECT_EQ(recovered(), "0 a:\n1b:\n2");
    EXPECT_TRUE(told("the schema from before the change is in force"));
    EXPECT_TRUE(told(dir_.path("a.tmp.old") + " takes the place of " + dir_.path("a")));
    EXPECT_TRUE(told(dir_.path("b.tmp") + " is removed"));

    dir_.write("a", "new");
    dir_.write("a.tmp.old", "1");
    EXPECT_EQ(recovered(), "0 a:\nnewb:\n2");
    EXPECT_TRUE(told("the changed schema is in force"));

    dir_.write("b.tmp", "new");
    EXPECT_EQ(recovered(), "0 a:\nnewb:\n2");
    EXPECT_TRUE(told("interrupted before its commit"));

    fs::remove(dir_.path("b"));
    dir_.write("b.tmp", "torn");
    EXPECT_EQ(recovered(), "1 a:\nnewb.tmp:\ntorn");
    EXPECT_TRUE(told("nothing was touched"));

    fs::remove(dir_.path("a"));
    fs::create_directory(dir_.path("a"));  // nothing can take its place
    dir_.write("a.tmp.old", "1");
    dir_.write("b", "2");
    EXPECT_EQ(recovered().substr(0, 2), "1 ");
    EXPECT_TRUE(told("Error - ldcf_recover_files: "));
    EXPECT_EQ(dir_.read("b.tmp"), "torn");  // still says that the commit was not through
}

TEST_F(SchemaRecover, OnlyWhatAChangeWroteIsALeftover)
{
    dir_.write("a", "1");
    dir_.write("a.tmp", "2");
    dir_.write("b", "3");
    fs::create_directory(dir_.path("b.tmp"));
    ldcf_recovery listed(paths({"a", "a.tmp", "b"}));  // the schema file "a.tmp" has an unlucky name
    EXPECT_EQ(listed.found(), ldcf_leftovers::none);
    EXPECT_STREQ(listed.text(), "");
    ldcf_recovery leftover(paths({"a", "b"}));
    EXPECT_EQ(leftover.found(), ldcf_leftovers::unused);
    EXPECT_EQ(leftover.concerned(), paths({"a"}));
    leftover.run();
    EXPECT_EQ(leftover.found(), ldcf_leftovers::none);
    EXPECT_EQ(content_of(dir_.path()), "a:\n1b.tmp:\na folder\nb:\n3");
}

TEST_F(SchemaRecover, ALinkIsPutBackAsALink)
{
    dir_.write("elsewhere", "1");
    fs::create_symlink(dir_.path("elsewhere"), dir_.path("a.tmp.old"));
    dir_.write("a", "new");
    dir_.write("b", "2");
    dir_.write("b.tmp", "new");
    EXPECT_EQ(recovered(), "0 a:\n1b:\n2elsewhere:\n1");
    EXPECT_TRUE(fs::is_symlink(dir_.path("a")));
}

TEST_F(SchemaRecover, AChangeBeginsWithWhatAnEarlierOneCouldNotPutBack)
{
    const schema_test::relational_store store;
    ldcf_schema_g->parse(dir_.write("a", schema_test::required_text()).c_str());
    ldcf_schema_g->parse(dir_.write("b", schema_test::small_text).c_str());
    ldcf_schema_g->complete();
    ldcf_schema_g->complete_db_names();
    dir_.write("a", "of the failed change");
    dir_.write("a.tmp.old", schema_test::required_text());
    dir_.write("b.tmp", "of the failed change");

    const auto change = [&](int oid) {
        ldcf_syntax added = schema_test::parsed<ldcf_syntax>("( 5." + std::to_string(oid) + " )");
        for (const ldcf_modify_phase phase : {ldcf_modify_vote, ldcf_modify_commit, ldcf_modify_cleanup}) {
            EXPECT_EQ(ldcf_schema_modify_syntax(nullptr, ldcf_modify_add, phase, added), 0);
        }
        EXPECT_EQ(dir_.read("a"), schema_test::required_text());
        EXPECT_NE(dir_.read("b").find("( 5." + std::to_string(oid) + " )"), std::string::npos);
        EXPECT_EQ(std::distance(fs::directory_iterator(dir_.path()), fs::directory_iterator()), 2);
    };
    change(1);
    // A temporary file of a file that isn't changed would make the commit look as if it had not come to its end.
    dir_.write("a.tmp", "of the failed change");
    change(2);
    ldcf_schema_g->clear();
}
