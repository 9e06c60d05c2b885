// dirbase ldif print and diff: the forms of entries, and changes that do what they should when they are applied.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <nlohmann/json.hpp>
#include <random>
#include <set>
#include <sstream>

#include "tests/tools/dirbase/run_tool.h"

using test_support::temp_dir;
using testing::HasSubstr;
using testing::StartsWith;
using tool_test::joined;
using tool_test::lines_of;
using tool_test::run_settings;
using tool_test::run_tool;
using tool_test::tool_run;
using tool_test::words;

namespace {

const std::string sample = std::string(DIRBASE_SOURCE_SCHEMA_DIR) + "/../sample/organisation.ldif";

std::string print(const std::string& file)
{
    const tool_run run = run_tool({"ldif", "print", file});
    EXPECT_EQ(run.status, 0) << run.err;
    return run.out;
}

// A record of an LDIF file: its lines, unfolded, as pairs of type and the rest. Base64 stays what it is.
using record = std::vector<std::pair<std::string, std::string>>;

std::vector<record> records_of(const std::string& text)
{
    std::vector<record> records(1);
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (line.empty()) {
            records.emplace_back();
        } else if (line[0] == ' ') {
            records.back().back().second += line.substr(1);
        } else {
            const std::size_t colon = std::min(line.find(':'), line.size());
            records.back().emplace_back(line.substr(0, colon), line.substr(std::min(colon + 1, line.size())));
        }
    }
    std::erase_if(records, [](const record& r) { return r.empty() || r[0].first == "version"; });
    return records;
}

using values = std::map<std::string, std::set<std::string>>;
using directory = std::map<std::string, values>;

directory directory_of(const std::string& text)
{
    directory entries;
    for (const record& lines : records_of(text)) {
        values& entry = entries[lines[0].second];
        for (std::size_t i = 1; i < lines.size(); ++i) {
            EXPECT_TRUE(entry[lines[i].first].insert(lines[i].second).second);
        }
    }
    return entries;
}

std::string parent_of(const std::string& dn)
{
    std::size_t comma = 0;
    do {
        comma = dn.find(',', comma + 1);
    } while (comma != std::string::npos && dn[comma - 1] == '\\');
    return comma == std::string::npos ? "" : " " + dn.substr(comma + 1);
}

// Does what a change record says, as a server would: parents first, leaves last, and no value twice.
void apply(directory& entries, const record& change)
{
    const std::string& dn = change[0].second;
    ASSERT_EQ(change[1].first, "changetype");
    if (change[1].second == " add") {
        EXPECT_TRUE(entries.contains(parent_of(dn))) << "no parent: " << dn;
        ASSERT_TRUE(entries.emplace(dn, values()).second) << dn;
        for (std::size_t i = 2; i < change.size(); ++i) {
            EXPECT_TRUE(entries[dn][change[i].first].insert(change[i].second).second) << dn;
        }
        return;
    }
    ASSERT_TRUE(entries.contains(dn)) << dn;
    if (change[1].second == " delete") {
        EXPECT_TRUE(std::none_of(entries.begin(), entries.end(),
                                 [&](const auto& entry) { return parent_of(entry.first) == dn; }))
            << "not a leaf: " << dn;
        entries.erase(dn);
        return;
    }
    ASSERT_EQ(change[1].second, " modify");
    for (std::size_t i = 2; i < change.size(); ++i) {
        const std::string operation = change[i].first;
        const std::string type = change[i].second.substr(1);
        std::set<std::string> listed;
        for (++i; change[i].first != "-"; ++i) {
            ASSERT_EQ(change[i].first, type);
            listed.insert(change[i].second);
        }
        std::set<std::string>& held = entries[dn][type];
        const bool all = operation == "replace" || (operation == "delete" && listed.empty());
        std::set<std::string> rest = all ? std::set<std::string>() : held;
        for (const std::string& value : listed) {
            EXPECT_TRUE(operation == "delete" ? rest.erase(value) == 1 : rest.insert(value).second) << dn << type;
        }
        held = rest;
        if (held.empty()) {
            entries[dn].erase(type);
        }
    }
}

std::string text_of(const directory& entries)
{
    std::string text;
    for (const auto& [dn, attributes] : entries) {
        text += "dn:" + dn + "\n";
        for (const auto& [type, held] : attributes) {
            for (const std::string& value : held) {
                text += type + ":" + value + "\n";
            }
        }
        text += "\n";
    }
    return text;
}

}  // namespace

TEST(LdifPrint, WhatIsPrintedPrintsTheSameAgainAndIsTheSameData)
{
    const temp_dir dir;
    const std::string once = print(sample);
    const std::string file = dir.write("once", once);
    EXPECT_EQ(print(file), once);
    EXPECT_EQ(run_tool({"ldif", "check", file}).out, "358 entries, 358 accepted, 0 refused\n");
    const tool_run same = run_tool({"ldif", "diff", sample, file});
    EXPECT_EQ(same.status, 0);
    EXPECT_EQ(same.out, "");
}

TEST(LdifPrint, AnEntryHasThreeForms)
{
    const std::string entry = "dn: cn=g\nobjectclass: groupOfNames\nmember: cn=a\nMEMBER: cn=b\n2.5.4.3: \xC3\xBC\n";
    const struct {
        const char* form;
        std::string out;
    } cases[] = {
        {"ldif", "dn: cn=g\nobjectclass: groupOfNames\nmember: cn=a\nmember: cn=b\ncn:: w7w=\n"},
        {"no-members", "dn: cn=g\nobjectclass: groupOfNames\nmember: CN=NULL\ncn:: w7w=\n"},
        {"ber",  // 30 SEQUENCE, 31 SET, 04 OCTET STRING, each with its length
         "304b0404636e3d673043301d040b6f626a656374636c617373310e040c67726f\n"
         "75704f664e616d6573301604066d656d626572310c0404636e3d610404636e3d\n"
         "62300a0402636e31040402c3bc\n"},
    };
    for (const auto& c : cases) {
        const tool_run run = run_tool({"ldif", "print", "--form", c.form, "-"}, {.input = entry});
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_EQ(run.out, c.out);
    }
    const auto shown = nlohmann::json::parse(run_tool({"ldif", "print", "--json", "-"}, {.input = entry}).out);
    EXPECT_EQ(shown["entries"][0]["text"], cases[0].out);
}

TEST(LdifPrint, EntriesThatCannotBeReadAreLeftOutAndTold)
{
    const tool_run run =
        run_tool({"ldif", "print", "-"}, {.input = "dn: o=a\nx\n\ndn: o=b\n\ndn: x=c\n\ndn: o=d\nunknown: y\n"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.out, "dn: o=b\n\ndn: o=d\nunknown: y\n");
    EXPECT_EQ(run.err,
              "standard input:2: o=a: no \":\" in \"x\"; the entry is left out\n"
              "standard input:6: x=c: dn: 17 undefinedAttributeType at byte 0: the schema has no such attribute "
              "type; the entry is left out\n");
    std::string many = "dn: o=a\n\ndn: o=b\n";
    for (int i = 0; i < 25; ++i) {
        many += "x\n";
    }
    for (const words& call : {words{"print", "-"}, {"search", "-", "(o=*)"}, {"diff", "-", "/dev/null"}}) {
        const tool_run told = run_tool(joined({"ldif"}, call), {.input = many});
        EXPECT_THAT(told.err, HasSubstr("standard input:3: and 5 more faults in this entry\n")) << call[0];
        EXPECT_EQ(lines_of(told.err).size(), call[0] == "diff" ? 22u : 21u) << told.err;
        const std::string large = many.substr(0, 9) + "dn: o=c\no: " + std::string(17'000'000, 'x') + "\n";
        EXPECT_THAT(run_tool(joined({"ldif"}, call), {.input = large}).err,
                    StartsWith("standard input:3: o=c: an entry of 17000012 bytes, more than 16777216"))
            << call[0];
    }
}

TEST(LdifPrint, FilesThatManyEntriesNameAreHeldOneAfterTheOther)
{
    const temp_dir dir;
    const std::string value(1'000'000, 'x');
    const std::string url = "file://" + dir.write("value", value);
    std::string text;
    constexpr std::size_t count = 100;
    for (std::size_t i = 0; i < count; ++i) {
        text += "dn: o=" + std::to_string(i) + "\no:< " + url + "\n\n";
    }
    const std::string file = dir.write("in", text);
    run_settings settings = {.output_path = dir.write("out", "")};
#if !defined(__SANITIZE_THREAD__) && !defined(__SANITIZE_ADDRESS__)
    settings.in_front = {"prlimit", "--data=" + std::to_string(std::size_t{60} << 20)};
#endif
    for (const words& call : {words{"print", file},
                              {"search", "--threads", "1", file, "(o=*)"},
                              {"search", "--threads", "3", file, "(o=*)"}}) {
        std::filesystem::resize_file(settings.output_path, 0);
        const tool_run run = run_tool(joined({"ldif"}, call), settings);
        EXPECT_EQ(run.status, 0) << run.err;
        const std::string out = dir.read("out");
        std::size_t at = 0;
        std::size_t i = 0;
        for (; i < count && at != std::string::npos; ++i) {
            at = out.find("dn: o=" + std::to_string(i) + "\no: x", at);
        }
        EXPECT_TRUE(at != std::string::npos && out.size() > count * value.size()) << call[0] << i;
    }
}

TEST(LdifDiff, ChangesAreAsSmallAsTheSyntaxAllows)
{
    const struct {
        const char* before;
        const char* after;
        const char* changes;  // of the one entry
    } cases[] = {
        {"cn: A", "commonName: a\ncn: x", ""},  // the naming attribute is part of both
        {"owner: cn=A, o=b\ndescription: T  x", "2.5.4.32: CN=a,O=B\ndescription: t  X", ""},
        {"uidNumber: 7\npwdReset: true\ncreateTimestamp: 20240101000000Z", "uidNumber: 007\npwdReset: TRUE", ""},
        {"x-unknown: a", "X-UNKNOWN: a", ""},
        {"sn: a\nsn: b\nsn: c\nsn: d", "sn: B\nsn: e\nsn: a\nsn: c", "delete: sn\nsn: d\n-\nadd: sn\nsn: e\n-\n"},
        {"sn: a\nsn: b", "sn: c\nsn: d", "replace: sn\nsn: c\nsn: d\n-\n"},
        {"sn: a", "sn: a\nsn: b\nsn;lang-de: c", "add: sn\nsn: b\n-\nadd: sn;lang-de\nsn;lang-de: c\n-\n"},
        {"sn: a\nsn;lang-de: b", "", "delete: sn\n-\ndelete: sn;lang-de\n-\n"},
        {"uidNumber: 7", "uidNumber: 8", "replace: uidNumber\nuidNumber: 8\n-\n"},  // it takes one value
        {"uidNumber: x1", "uidNumber: x2", "replace: uidNumber\nuidNumber: x2\n-\n"},
        // What isn't of its syntax is compared byte for byte; the rest of its attribute isn't.
        {"member: x1\nmember: cn=A\nmember: x2\nmember: cn=b", "member: CN=a\nmember: x3\nmember: cn=B\nmember: x1",
         "delete: member\nmember: x2\n-\nadd: member\nmember: x3\n-\n"},
        {"", "member: x\nmember: cn=a\nmember: x\nmember: CN=A", "add: member\nmember: cn=a\nmember: x\n-\n"},
        {"jpegPhoto;binary: a\njpegPhoto;binary: a", "audio;binary: a\njpegPhoto;binary: a\naudio;binary: a",
         "add: audio;binary\naudio;binary: a\n-\n"},
        {"jpegPhoto: a\njpegPhoto: b\njpegPhoto: c", "jpegPhoto: a\njpegPhoto: b",
         "replace: jpegPhoto\njpegPhoto: a\njpegPhoto: b\n-\n"},  // no rule by which one is found
    };
    const temp_dir dir;
    for (const auto& c : cases) {
        const std::string before = dir.write("before", "dn: cn=x\n" + std::string(c.before));
        const std::string after = "dn: CN = X\n" + std::string(c.after);
        const tool_run run = run_tool({"ldif", "diff", before, "-"}, {.input = after});
        const std::string record = "version: 1\n\ndn: cn=x\nchangetype: modify\n";
        EXPECT_EQ(run.out, *c.changes == '\0' ? "" : record + c.changes) << c.before << " " << c.after;
        EXPECT_EQ(run.status, *c.changes == '\0' ? 0 : 1) << run.err;
    }
}

TEST(LdifDiff, ChangesAppliedToTheFirstFileGiveTheSecond)
{
    const directory before = directory_of(print(sample));
    // None of them names an entry.
    const std::set<std::string> edited = {"givenName", "sn",           "description", "title",   "title;lang-de",
                                          "member",    "uniqueMember", "jpegPhoto",   "manager", "telephoneNumber"};
    const temp_dir dir;
    std::mt19937 random(42);
    for (int round = 0; round < 5; ++round) {
        directory after = before;
        for (auto& [dn, attributes] : after) {
            for (auto& [type, held] : attributes) {
                if (!edited.contains(type) || random() % 4 != 0) {
                    continue;
                }
                if (random() % 2 == 0) {
                    held.erase(held.begin());
                }
                for (auto more = random() % 3; more > 0; --more) {
                    held.insert(" cn=new " + std::to_string(random() % 10));
                }
            }
            std::erase_if(attributes, [](const auto& attribute) { return attribute.second.empty(); });
        }
        // Whole subtrees go, and come elsewhere.
        directory moved;
        std::erase_if(after, [&](const auto& entry) {
            const std::string unit = round % 2 == 0 ? ",ou=Groups,o=Quillhaven Works" : ",ou=Rooms,o=Quillhaven Works";
            const bool goes = ("," + entry.first.substr(1)).ends_with(unit);
            if (goes && entry.first.find(",ou=") != std::string::npos && random() % 2 == 0) {
                const std::string dn = entry.first.substr(0, entry.first.find(",ou=")) + ",ou=Moved,o=Quillhaven Works";
                moved[dn] = entry.second;
            }
            return goes;
        });
        after.merge(moved);
        after[" ou=Moved,o=Quillhaven Works"] = {{"objectClass", {" organizationalUnit"}}, {"ou", {" Moved"}}};

        const std::string target = dir.write("after", text_of(after));
        const tool_run run = run_tool({"ldif", "diff", sample, target});
        EXPECT_EQ(run.status, 1) << run.err;
        directory changed = before;
        const std::vector<record> changes = records_of(run.out);
        EXPECT_GT(changes.size(), 50u);
        for (const record& change : changes) {
            apply(changed, change);
        }
        EXPECT_TRUE(changed == after) << "round " << round;
    }
}

TEST(LdifDiff, WhatCannotBeComparedGivesTwo)
{
    const temp_dir dir;
    const std::string good = dir.write("good", "dn: o=a\n\ndn: cn=x,o=a\n");
    const struct {
        const char* text;
        const char* message;
    } cases[] = {
        {"dn: o=b\n\ndn: O=B\n", "standard input:3: O=B: the file has this entry already"},
        {"o: b\n", "standard input:1: no DN"},
        {"dn: o=b\nchangetype: delete\n", "standard input:2: o=b: changetype"},
    };
    for (const auto& c : cases) {
        const tool_run run = run_tool({"ldif", "diff", good, "-"}, {.input = c.text});
        EXPECT_EQ(run.status, 2) << c.message;
        EXPECT_THAT(run.err, HasSubstr(c.message));
        EXPECT_EQ(run.out, "");
    }
    EXPECT_EQ(run_tool({"ldif", "diff", "-", "-"}).status, 2);
    const tool_run orphan = run_tool({"ldif", "diff", good, "-"}, {.input = "dn: cn=x,o=a\n"});
    EXPECT_EQ(orphan.status, 1);
    EXPECT_THAT(orphan.err, HasSubstr("note: cn=x,o=a stays, and its parent goes"));
}
