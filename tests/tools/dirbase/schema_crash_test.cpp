// A schema change that is killed, or has a system call fail, at every one of its calls on the schema directory: what
// is loaded afterwards is the schema from before the change or the changed one, whole, and so it stays when the
// recovery is killed or fails in its turn.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <csignal>
#include <iostream>
#include <set>

#include "tests/tools/dirbase/run_tool.h"

using testing::HasSubstr;
using tool_test::folder_contents;
using tool_test::run_tool;
using tool_test::tool_run;

namespace fs = std::filesystem;

#ifdef DIRBASE_FAILING_CALLS

namespace {

#define ARC "1.3.6.1.4.1.1466.115.121.1."

constexpr char main_text[] =
    "attributeTypes { ( 9.1 NAME 'objectClass' EQUALITY 2.5.13.0 SYNTAX " ARC "38 )\n"
    "( 9.2 NAME 'name' EQUALITY caseIgnoreMatch SYNTAX " ARC "15{64} ) ( 9.5 NAME 'spare' SUP name ) }\n"
    "objectClasses { ( 8.1 NAME 'top' ABSTRACT MUST objectClass ) ( 8.2 NAME 'guest' SUP top MUST name ) }\n";

// The extended definition has another home than its type, so a change of both rewrites two files.
constexpr char additions_text[] = "XANattributeTypes { ( 9.5 LENGTH 5 ) }\n";

struct change {
    const char* name;
    const char* operation;
    const char* definition;
    std::size_t files;
};

void PrintTo(const change& one, std::ostream* out)
{
    *out << one.name;
}

constexpr change changes[] = {
    {"Add", "add", "attributeTypes: ( 9.9 NAME 'badge' SUP name ) XANattributeTypes: ( 9.9 LENGTH 9 )", 1},
    {"ReplaceInOneFile", "replace", "objectClasses: ( 8.2 NAME 'guest' SUP top MUST name MAY spare )", 1},
    {"ReplaceInTwoFiles", "replace",
     "attributeTypes: ( 9.5 NAME 'spare' DESC 'd' SUP name ) XANattributeTypes: ( 9.5 LENGTH 7 )", 2},
    {"DeleteInTwoFiles", "delete", "attributeTypes: ( 9.5 )", 2},
};

// Everything in a folder: each name with its content, and with the name that is another one of the same file.
using folder_state = std::map<std::string, std::string>;

std::string what_failed(const std::string& how, int at, const std::string& call)
{
    return how + " at call " + std::to_string(at) + ", " + call;
}

class SchemaCrash : public testing::TestWithParam<change> {
protected:
    SchemaCrash()
    {
        std::string required;
        for (const char* name : {"V3.core.sx", "V3.core.mr", "V3.x509.sx", "V3.x509.mr"}) {
            required += test_support::file_text(std::string(DIRBASE_SOURCE_SCHEMA_DIR "/") + name);
        }
        before_ = {{"schema.list", "required\nmain\nadditions\n"},
                   {"required", required},
                   {"main", main_text},
                   {"additions", additions_text}};
        definition_ = dir_.write("definition", GetParam().definition);
        probe_ = dir_.write("probe", "objectClasses: ( 8.9 NAME 'probe' SUP top )");
        report_ = dir_.write("report", "");

        restore(before_);
        old_print_ = print();
        const tool_run run = modify();
        EXPECT_EQ(run.status, 0) << run.err;
        new_print_ = print();
        after_ = state();
        EXPECT_EQ(after_.size(), before_.size());
        EXPECT_NE(old_print_, new_print_);
        std::size_t changed = 0;
        for (const auto& [name, content] : after_) {
            changed += content == before_[name] ? 0u : 1u;
        }
        EXPECT_EQ(changed, GetParam().files);
    }

    std::string folder() const { return dir_.path("schema"); }

    folder_state state() const
    {
        folder_state all;
        std::map<ino_t, std::string> first_name;
        for (const fs::directory_entry& entry : fs::directory_iterator(folder())) {
            const std::string name = entry.path().filename().string();
            struct stat status = {};
            EXPECT_EQ(stat(entry.path().c_str(), &status), 0);
            all[name] = dir_.read("schema/" + name);
        }
        for (const auto& [name, content] : all) {  // in the order of the names
            struct stat status = {};
            EXPECT_EQ(stat((folder() + "/" + name).c_str(), &status), 0);
            const auto [first, added] = first_name.emplace(status.st_ino, name);
            if (!added) {
                all[name] = "=" + first->second;
            }
        }
        return all;
    }

    void restore(const folder_state& wanted) const
    {
        fs::remove_all(folder());
        for (const auto& [name, content] : wanted) {
            if (content.starts_with("=")) {
                fs::create_hard_link(folder() + "/" + content.substr(1), folder() + "/" + name);
            } else {
                dir_.write("schema/" + name, content);
            }
        }
    }

    tool_run run(const std::vector<std::string>& words, const std::vector<std::string>& in_front = {}) const
    {
        std::vector<std::string> all = {"schema", words.front(), "--schema", folder()};
        all.insert(all.end(), words.begin() + 1, words.end());
        return run_tool(all, {.in_front = in_front});
    }
    tool_run modify(const std::vector<std::string>& in_front = {}) const
    {
        return run({"modify", GetParam().operation, definition_}, in_front);
    }
    std::string print() const
    {
        const tool_run result = run({"print"});
        EXPECT_EQ(result.status, 0) << result.err;
        return result.out;
    }

    // What to put in front of the tool to have it killed, or a call of it fail.
    std::vector<std::string> disturbed(const std::string& how, int at, const std::string& which) const
    {
        dir_.write("report", "");
        return {"env",
                "LD_PRELOAD=" DIRBASE_FAILING_CALLS,
                "FAILING_CALLS_BELOW=" + folder() + "/",
                "FAILING_CALLS_WHICH=" + which,
                "FAILING_CALLS_AT=" + std::to_string(at),
                "FAILING_CALLS_HOW=" + how,
                "FAILING_CALLS_REPORT=" + report_};
    }

    // Which schema the folder holds: 'o' the old one, 'n' the new one, '?' none of them. The run must be in order.
    char verdict_of(const tool_run& printed) const
    {
        EXPECT_EQ(printed.status, 0) << printed.err;
        return printed.out == old_print_ ? 'o' : printed.out == new_print_ ? 'n' : '?';
    }

    // Starts anew on what a run has left, in every way: as it is, with a recovery that can write nothing, and with one
    // that is killed after each of its steps. Returns the verdict, on which all agree. What was looked at once isn't
    // again.
    char verdict()
    {
        const folder_state left = state();
        if (const auto known = verdicts_.find(left); known != verdicts_.end()) {
            return known->second;
        }
        const bool interrupted = has_backup_or_gap(left);
        recoveries_ += interrupted ? 1 : 0;

        const tool_run first = run({"print"});
        const char answer = verdict_of(first);
        const std::string told =
            answer == 'o' ? "the schema from before the change is in force" : "the changed schema is in force";
        EXPECT_EQ(first.err.find(told) != std::string::npos, interrupted) << first.err;
        EXPECT_EQ(run({"check"}).status, 0);
        EXPECT_EQ(verdict_of(run({"print"})), answer);
        EXPECT_FALSE(has_backup_or_gap(state()));

        if (interrupted) {
            restore(left);
            const tool_run unable = run({"print"}, disturbed("EROFS-from-here", 1, "changes"));
            EXPECT_EQ(verdict_of(unable), answer);
            EXPECT_THAT(unable.err, HasSubstr("the folder is left as it is, since "));
            EXPECT_EQ(state(), left);
            const tool_run refused = run({"modify", "add", probe_}, disturbed("EROFS-from-here", 1, "changes"));
            EXPECT_EQ(refused.status, 2);
            EXPECT_EQ(state(), left);

            for (const char* how : {"kill-after", "EIO"}) {
                for (int at = 1;; ++at) {
                    restore(left);
                    const tool_run disturbed_run = run({"print"}, disturbed(how, at, "changes"));
                    if (dir_.read("report").empty()) {
                        break;
                    }
                    ++recovery_points_;
                    SCOPED_TRACE(what_failed(std::string(how) + " of the recovery", at, dir_.read("report")));
                    if (*how == 'E') {
                        EXPECT_EQ(verdict_of(disturbed_run), answer);
                    }
                    EXPECT_EQ(verdict_of(run({"print"})), answer);
                    EXPECT_FALSE(has_backup_or_gap(state()));
                }
            }
        }

        // The next change that goes through clears up all.
        restore(left);
        const tool_run next = run({"modify", "add", probe_});
        EXPECT_EQ(next.status, 0) << next.err;
        EXPECT_EQ(run({"modify", "delete", probe_}).status, 0);
        EXPECT_EQ(verdict_of(run({"print"})), answer);
        EXPECT_EQ(names_of(state()), names_of(before_));
        verdicts_[left] = answer;
        return answer;
    }

    bool has_backup_or_gap(const folder_state& left) const
    {
        for (const auto& [name, content] : left) {
            if (name.ends_with(".tmp.old")) {
                return true;
            }
        }
        for (const auto& [name, content] : before_) {
            if (left.count(name) == 0) {
                return true;
            }
        }
        return false;
    }

    static std::set<std::string> names_of(const folder_state& any)
    {
        std::set<std::string> names;
        for (const auto& [name, content] : any) {
            names.insert(name);
        }
        return names;
    }

    const test_support::temp_dir dir_;
    folder_state before_;
    folder_state after_;
    std::string definition_;
    std::string probe_;
    std::string report_;
    std::string old_print_;
    std::string new_print_;
    std::map<folder_state, char> verdicts_;
    int recoveries_ = 0;
    int recovery_points_ = 0;
};

}  // namespace

TEST_P(SchemaCrash, WhatIsLoadedAfterwardsIsTheOldSchemaOrTheNewOneWhole)
{
    // With the last one nothing of a failed commit can be put back.
    const struct {
        const char* how;
        const char* which;
    } ways[] = {{"kill-before", "changes"}, {"kill-after", "all"},          {"EIO", "all"},
                {"ENOSPC", "changes"},      {"EROFS-from-here", "changes"}, {"EIO-and-renames", "changes"}};
    for (const auto& way : ways) {
        const std::string how = way.how;
        const bool killed = how.starts_with("kill");
        std::map<char, int> points;
        for (int at = 1;; ++at) {
            restore(before_);
            const tool_run ended = modify(disturbed(way.how, at, way.which));
            const std::string call = dir_.read("report");
            SCOPED_TRACE(what_failed(how, at, call));
            if (call.empty()) {  // the run made fewer calls
                EXPECT_EQ(ended.status, 0);
                EXPECT_TRUE(state() == after_);
                break;
            }
            const char now = verdict();
            ++points[now];
            if (killed) {
                EXPECT_EQ(ended.status, 1000 + SIGKILL);
                EXPECT_NE(now, '?');
            } else {
                EXPECT_EQ(now, ended.status == 0 ? 'n' : 'o') << ended.err;
                EXPECT_TRUE(ended.status == 0 || ended.status == 2) << ended.status << ended.err;
            }
        }
        std::cout << GetParam().name << ", " << how << ": " << points['o'] + points['n'] << " points, " << points['o']
                  << " with the old schema, " << points['n'] << " with the new one\n";
        EXPECT_GT(points['o'], 0);
        EXPECT_GT(points['n'], 0);
    }
    std::cout << GetParam().name << ": " << verdicts_.size() << " different folders, " << recoveries_
              << " recovered, at " << recovery_points_ << " points of the recovery itself\n";
    EXPECT_GE(recoveries_, 4);  // the backup, the gap, the link and the clearing up of a file
    EXPECT_GT(recovery_points_, recoveries_);
}

// States of the folder that a commit as it runs doesn't leave: without backups, or with some of them gone.
class SchemaLeftovers : public SchemaCrash {
protected:
    // For the two files that change, and for each of their names (its own, temporary, backup) which content stands
    // there: o the old one, n the new one, t a torn one, - none.
    folder_state folder_of(const std::string& additions, const std::string& main)
    {
        folder_state made = before_;
        for (const auto& [file, code] : {std::pair("additions", additions), std::pair("main", main)}) {
            made.erase(file);
            const char* const suffixes[] = {"", ".tmp", ".tmp.old"};
            for (std::size_t at = 0; at < 3; ++at) {
                const std::string& fresh = after_[file];
                if (code[at] != '-') {
                    made[file + std::string(suffixes[at])] = code[at] == 'o'   ? before_[file]
                                                             : code[at] == 'n' ? fresh
                                                                               : fresh.substr(0, fresh.size() / 2);
                }
            }
        }
        return made;
    }
};

TEST_P(SchemaLeftovers, WhateverIsLeftMakesOneSchemaOrIsLeftAlone)
{
    const struct {
        const char* additions;
        const char* main;
        char expected;
    } cases[] = {
        // Only the temporary file stands for a file: nobody kept the old content.
        {"-n-", "on-", 'n'},
        {"n--", "-n-", 'n'},
        {"-n-", "-n-", 'n'},
        {"-no", "-n-", 'n'},
        {"-n-", "-no", 'n'},
        {"n-o", "-n-", 'n'},
        // A file that could not be put back, while the temporary file of the next one still stands.
        {"n-o", "on-", 'o'},
        {"n-o", "-no", 'o'},
        {"--o", "n-o", 'o'},
        {"n-o", "--o", 'o'},
        {"--o", "--o", 'o'},
        {"n-o", "n--", 'n'},
        // Torn temporary files count only where they would be needed.
        {"ot-", "o--", 'o'},
        {"oto", "ot-", 'o'},
        {"-to", "-to", 'o'},
        {"-t-", "o--", 'x'},
        {"-n-", "ot-", 'x'},
        // Neither schema is there.
        {"---", "on-", 'x'},
        {"--o", "-n-", 'x'},
        {"---", "n-o", 'x'},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.additions) + " " + c.main);
        const folder_state made = folder_of(c.additions, c.main);
        restore(made);
        if (c.expected != 'x') {
            EXPECT_EQ(verdict(), c.expected);
            continue;
        }
        for (const char* command : {"check", "print"}) {
            const tool_run unclear = run({command});
            EXPECT_EQ(unclear.status, 2);
            EXPECT_THAT(unclear.err, HasSubstr("neither the schema from before the change nor the changed one"));
            EXPECT_THAT(unclear.err, HasSubstr("No such file"));
        }
        EXPECT_EQ(run({"modify", "add", probe_}).status, 2);
        EXPECT_EQ(state(), made);
    }
}

INSTANTIATE_TEST_SUITE_P(Changes, SchemaLeftovers, testing::Values(changes[2]),
                         [](const auto& one) { return std::string(one.param.name); });

INSTANTIATE_TEST_SUITE_P(Changes, SchemaCrash, testing::ValuesIn(changes),
                         [](const auto& one) { return std::string(one.param.name); });

#else

TEST(SchemaCrash, WhatIsLoadedAfterwardsIsTheOldSchemaOrTheNewOneWhole)
{
    GTEST_SKIP() << "a sanitizer's runtime has to be the first library of a program, where ours would have to be";
}

#endif
