// dirbase ldif check: verdicts and their places, rejects, threads, and input of every kind and size.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <map>
#include <nlohmann/json.hpp>
#include <random>
#include <regex>

#include "tests/tools/dirbase/run_tool.h"

using test_support::file_text;
using test_support::temp_dir;
using testing::AllOf;
using testing::ContainsRegex;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using tool_test::joined;
using tool_test::lines_of;
using tool_test::run_settings;
using tool_test::run_tool;
using tool_test::tool_run;
using tool_test::words;

namespace {

const std::string samples = std::string(DIRBASE_SOURCE_SCHEMA_DIR) + "/../sample/";

tool_run check(const std::string& text, const words& options = {})
{
    return run_tool(joined({"ldif", "check", "-"}, options), {.input = text});
}

// "LINE KIND SUBJECT" of each fault.
words faults_of(const std::string& json_text)
{
    words faults;
    const auto shown = nlohmann::json::parse(json_text);
    for (const auto& fault : shown["faults"]) {
        std::string text = std::to_string(fault["line"].get<int>()) + " " + fault["kind"].get<std::string>();
        faults.push_back(fault.contains("subject") ? text + " " + fault["subject"].get<std::string>() : text);
    }
    return faults;
}

const std::string device = "objectClass: top\nobjectClass: device\n";
const std::string person = "objectClass: top\nobjectClass: person\n";
const std::string any = "objectClass: top\nobjectClass: device\nobjectClass: extensibleObject\n";

// Entries of which some have faults, in many batches.
std::string mixed_entries(std::size_t count)
{
    std::mt19937 random(7);
    std::string text;
    for (std::size_t i = 0; i < count; ++i) {
        text += "dn: cn=d" + std::to_string(i) + ",o=x\n" + device;
        const char* const more[] = {"",
                                    "",
                                    "description: "
                                    "0123456789\n",
                                    "owner: nobody\n",
                                    "uidNumber: x\n",
                                    "no colon\n",
                                    "dn: o=x\n",
                                    "serialNumber: 1\nserialNumber: 1\n"};
        text += more[random() % std::size(more)];
        text += random() % 50 == 0 ? "\r\n" : "\n";
    }
    return text;
}

}  // namespace

TEST(LdifCheck, TheSampleOrganisationPassesWhole)
{
    const std::string file = samples + "organisation.ldif";
    for (const words& more : {words{}, {"--threads", "1"}, {"--mode", "3"}, {"--policy"}}) {
        const tool_run run = run_tool(joined({"ldif", "check", file}, more));
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_EQ(run.out, "358 entries, 358 accepted, 0 refused\n");
    }
    EXPECT_EQ(check(file_text(file)).status, 0);
}

TEST(LdifCheck, EachSampleFaultIsFoundAsItsCommentNamesIt)
{
    const std::string text = file_text(samples + "faults.ldif");
    words named;
    const std::regex comment("\n# fault: (\\S+)");
    for (std::sregex_iterator at(text.begin(), text.end(), comment), end; at != end; ++at) {
        named.push_back((*at)[1]);
    }
    const tool_run run = run_tool({"ldif", "check", "--json", samples + "faults.ldif"});
    EXPECT_EQ(run.status, 1);
    const auto shown = nlohmann::json::parse(run.out);
    words found;
    for (const auto& fault : shown["faults"]) {
        found.push_back(fault["kind"]);
    }
    EXPECT_EQ(found, named);
    EXPECT_EQ(shown["kinds"].size(), 26u) << "each kind once, but for too-large and what no kind fits";
    EXPECT_EQ(shown["refused"], shown["entries"]);
}

TEST(LdifCheck, FaultsHaveTheirLineAndSubjectAndWhatIsNoneHasNot)
{
    const temp_dir dir;
    const std::string url = "file://" + dir.write("in%20it", "value of a file\n");
    const std::string escaped = std::regex_replace(url, std::regex("%"), "%25");
    const std::string mark = "\xEF\xBB\xBF";
    const std::string large = "seeAlso:< file://" + dir.write("large", std::string(6 << 20, 'x')) + "\n";
    const struct {
        std::string text;
        words faults;
    } cases[] = {
        {"", {}},
        {"\n\n# nothing\n\nversion: 1\n\n   \n", {}},
        {"version: 1\ndn: cn=a\n" + device, {}},  // the naming attribute is added, and the last line has no end
        {"dn: cn=a\r\nobjectClass: top\r\nobjectClass: dev\r\n ice\r\n\r\ndn: cn=b\r\nx: y\r\nobjectClass: device\r\n",
         {"7 undefined-attribute x"}},
        {"dn:: Y249YQ==\nchangetype: add\n" + device, {}},
        {"dn: cn=a\ncontrol: 1.2.3 true\nchangetype: ADD\n" + device, {}},
        {"dn: cn=a\nchangetype: delete\n", {"2 changetype changetype"}},
        {"# of two\n  lines: cn\ndn: cn=a\n" + device + "2.5.4.13: an OID\nDESCRIPTION;lang-en: tagged\n", {}},
        {"dn: cn=a\n" + device + "description:< " + escaped + "\n", {}},
        {"dn: cn=a\n" + device + "description:< " + escaped + "x\ndescription:< file:///\n",
         {"4 bad-url description", "5 bad-url description"}},
        {"dn: cn=a\n" + device + large + large + large + "\ndn: cn=b\n" + device + large + large,
         {"6 bad-url seeAlso", "4 bad-dn-value seeAlso", "5 bad-dn-value seeAlso", "11 bad-dn-value seeAlso",
          "12 bad-dn-value seeAlso"}},  // an entry has room for two
        {"dn: cn=a\n" + device + "description:<   " + escaped + "\ndescription::   dA==\ndescription:  t\n",
         {}},  // of a plain value one space is taken
        {"dn: cn=a\n" + any + "uidNumber: 7\x01\nuidNumber:7\nho\x01st: x\nxyz :y\n:z\n",
         {"5 bad-value uidNumber", "7 bad-type ho\x01st", "8 undefined-attribute xyz", "9 bad-type"}},
        {mark + "dn: cn=a\n" + device + "\n" + mark + "dn: cn=b\n",
         {"5 no-dn", "5 bad-type " + mark + "dn"}},  // it is one at the begin alone
        {"dn: cn=a\n" + device + "description\n", {"4 no-colon"}},
        {"dn: cn=a\n" + device + "description;x: y\njpegPhoto;binary:: AA==\n",
         {"4 bad-option description;x", "5 not-allowed jpegPhoto"}},
        {"dn: cn=a\n" + any + "description:: YQ\ndescription:: Y!==\ndescription:: YQ==YQ==\ndescription:: YQ==\n",
         {"5 bad-base64 description", "6 bad-base64 description", "7 bad-base64 description"}},
        {"dn: cn=a\n" + any +
             "pwdReset: yes\nuidNumber: 2147483648\nc: xyz\nx121Address: 1 2\n"
             "createTimestamp: 2024\nx500UniqueIdentifier: '2'B\nlastModifiedTime: never\nmanager: x\nuidNumber: 7\n",
         {"5 bad-value pwdReset", "6 bad-value uidNumber", "7 bad-value c", "8 bad-value x121Address",
          "9 bad-value createTimestamp", "10 bad-value x500UniqueIdentifier", "11 bad-value lastModifiedTime",
          "12 bad-dn-value manager"}},
        {"dn: cn=a\n" + any + "jpegPhoto:: AAAA\njpegPhoto:: AAAB\njpegPhoto:: AAAA\nuidNumber: 7\nuidNumber: 007\n",
         {"7 duplicate-value jpegPhoto", "9 duplicate-value uidNumber"}},
        {"dn: cn=a\n" + person + "sn:: /\n", {"4 bad-base64 sn"}},  // and not that it is missing
        {"dn: cn=a\n" + person, {"1 missing-attribute sn"}},
        {"dn: uidNumber=6\n" + any + "cn: a\nuidNumber: 5\n", {"1 single-valued uidNumber"}},
        {"dn: cn=a\n" + person + "title: a\nhost: b\nhost: c\n",
         {"1 missing-attribute sn", "4 not-allowed title", "5 not-allowed host"}},
        {"dn: \n" + device, {"1 bad-dn dn"}},
        {"dn: x=a\n" + device, {"1 bad-dn dn"}},
        {"dn: cn=a\n" + device + std::string("cn: a\0b\n", 8) + "\ndn: cn=b\n" + device, {"4 nul-byte cn"}},
        {"dn: cn=a\n" + device + " \n\n x\ndn: cn=b\n" + device, {"6 fold-at-start"}},
    };
    for (const auto& c : cases) {
        const tool_run run = check(c.text, {"--json"});
        EXPECT_EQ(faults_of(run.out), c.faults) << c.text;
        EXPECT_EQ(run.status, c.faults.empty() ? 0 : 1) << c.text;
    }
    const tool_run shown =
        check("dn: cn=a\nobjectClass: top\nobjectClass: person\nsn:\n x\ndescription: \x1b[31m\ncn: A\n"
              "bell\a: x\n");
    EXPECT_EQ(shown.out,
              "standard input:8: cn=a: bell\\x07: no attribute name: a letter and then letters, digits, hyphens and "
              "options, or an OID\n1 entries, 0 accepted, 1 refused\n"
              "       1  bad-type             malformed attribute names\n");
}

TEST(LdifCheck, ModesAndPolicyAreThoseOfTheServer)
{
    const std::string two_kinds = "dn: cn=a\nsn: s\nobjectClass: top\nobjectClass: device\nobjectClass: person\n";
    const std::string no_superior = "dn: cn=a\nsn: s\nobjectClass: inetOrgPerson\n";
    const std::string inherited = "dn: cn=a\nobjectClass: organizationalPerson\n";
    const std::string operational = "dn: cn=a\n" + device + "createTimestamp: 20240101000000Z\n";
    const struct {
        std::string text;
        const char* accepted;  // the modes that take it
    } cases[] = {{two_kinds, "34"}, {no_superior, "34"}, {inherited, "4"}, {"dn: cn=a\n", "4"}, {operational, "4"}};
    for (const auto& c : cases) {
        for (const char mode : {'2', '3', '4'}) {
            const tool_run run = check(c.text, {"--mode", std::string(1, mode)});
            EXPECT_EQ(run.status == 0, std::string(c.accepted).find(mode) != std::string::npos) << c.text << mode;
        }
    }
    EXPECT_EQ(check(operational, {"--policy"}).status, 0);
    const std::string declared = "dn: uid=a\nobjectClass: inetOrgPerson\n";  // sn and cn are required by its superior
    EXPECT_EQ(check(declared, {"--mode", "1"}).status, 0);
    EXPECT_EQ(check(declared, {"--mode", "3"}).status, 1);
}

TEST(LdifCheck, RejectsAreTheEntriesAsTheyStoodWithTheReasonInFront)
{
    const temp_dir dir;
    const std::string good = "dn: cn=a\n" + device + "\n";
    const std::string bad =
        "# mine\ndn:  cn=b\r\nobjectClass:: dG9w\n" + std::string("x: \0\n", 5) + "description: a\n b";
    const std::string folded = " lost\ndn: cn=c\n" + device;
    const std::string file = dir.write("in", good + bad + "\n\n" + folded + "\n\n" + good);
    const tool_run run = run_tool({"ldif", "check", "--rejects", dir.path("out"), file});
    EXPECT_EQ(run.status, 1);
    const words told = lines_of(run.out);
    std::string expected;
    for (std::size_t i = 0; i < told.size() && told[i].starts_with(file); ++i) {
        const bool last = i + 1 == told.size() || !told[i + 1].starts_with(file);
        expected += (last ? bad + "\n\n" : "") + "# " + told[i] + "\n";
    }
    EXPECT_EQ(dir.read("out"), expected + "\n" + folded + "\n");
    const tool_run again = run_tool({"ldif", "check", dir.path("out")});
    EXPECT_THAT(again.out, HasSubstr("2 entries, 0 accepted, 2 refused\n"));
    EXPECT_EQ(again.out.substr(again.out.find("refused")), run.out.substr(run.out.find("refused")));
}

TEST(LdifCheck, AnyNumberOfThreadsSaysTheSame)
{
    const temp_dir dir;
    const std::string file = dir.write("in", mixed_entries(20'000));
    std::map<bool, std::pair<std::string, std::string>> expected;
    for (const char* threads : {"1", "2", "7"}) {
        for (const bool as_json : {false, true}) {
            words call = {"ldif", "check", "--threads", threads, "--rejects", dir.path("rejects"), file};
            if (as_json) {
                call.emplace_back("--json");
            }
            const tool_run run = run_tool(call);
            EXPECT_EQ(run.status, 1) << run.err;
            EXPECT_GT(lines_of(run.out).size(), 10'000u);
            const std::pair<std::string, std::string> result = {run.out, dir.read("rejects")};
            EXPECT_TRUE(expected.try_emplace(as_json, result).first->second == result) << threads;
        }
    }
    EXPECT_EQ(nlohmann::json::parse(expected[true].first)["entries"], 20'000);
}

TEST(LdifCheck, InputOfAnySizeGetsAnAnswerAndLosesNoOtherEntry)
{
#if defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "much text, which ThreadSanitizer follows byte by byte";
#endif
    const temp_dir dir;
    std::string many = "dn: cn=m\n" + any;
    std::string tags = many;
    for (int i = 0; i < 100'000; ++i) {
        many += "x" + std::to_string(i) + ": 1\n";
        tags += "description;lang-";
        for (int rest = i; rest > 0; rest /= 26) {
            tags += static_cast<char>('a' + rest % 26);
        }
        tags += "x: 1\n";
    }
    const std::string good = "\n\ndn: cn=a\n" + device + "\n";
    const std::string huge(100'000'000, 'x');
    const struct {
        std::string text;
        const char* told;
    } cases[] = {
        {"dn: cn=b\ncn: " + huge, "huge:3: cn=b: an entry of 100000015 bytes, more than 16777216"},
        {std::string(huge.size() / 2, '\n') + "dn: o=x", "huge:50000003: o=x: the entry has no object class"},
        {"dn: cn=b\n" + any + "description:: " + std::string(16'000'000, 'Y') + "\nx",
         "huge:8: cn=b: no \":\" in \"x\""},
        {many, "100000  undefined-attribute"},
        {tags, "huge:3: cn=m: more than 10000 attributes; the rest isn't checked"},
    };
    for (const auto& c : cases) {
        const std::string file = dir.write("huge", "\n\n" + c.text + good);
        words in_front;
#if !defined(__SANITIZE_ADDRESS__)
        in_front = {"prlimit", "--data=" + std::to_string(std::size_t{130} << 20)};
#endif
        const tool_run run = run_tool({"ldif", "check", "--threads", "1", "--rejects", dir.path("rejects"), file},
                                      {.in_front = in_front});
        EXPECT_EQ(run.status, 1) << run.err;
        EXPECT_THAT(run.out, AllOf(HasSubstr(c.told), HasSubstr("2 entries, 1 accepted, 1 refused\n")));
        EXPECT_LT(run.out.size(), 10'000u) << "nobody reads that";
        const std::string rejects = dir.read("rejects");
        const std::string text = c.text.substr(c.text.find_first_not_of('\n'));
        EXPECT_TRUE(rejects.ends_with("\n" + text + (text.ends_with('\n') ? "\n" : "\n\n"))) << c.told;
    }
}

TEST(LdifCheck, WhatIsNoLdifAtAllIsRefusedInFewWords)
{
    std::mt19937 random(1);
    std::string noise(1'000'000, '\0');
    for (char& c : noise) {
        c = static_cast<char>(random());
    }
    const tool_run run = check(noise);
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, AllOf(HasSubstr("more faults in this entry"), Not(ContainsRegex("[\x01-\x09\x0b-\x1f]"))));
}

TEST(LdifCheck, LongNamesInFaultsAreCut)
{
    const std::string huge(100'000, 'x');
    std::string text = "dn: cn=" + huge + "\n" + huge + "!: y\n";
    for (int i = 0; i < 30; ++i) {
        text += "x\n";
    }
    const tool_run run = check(text, {"--json"});
    EXPECT_EQ(run.status, 1);
    EXPECT_LT(run.out.size(), 22 * 16'500u) << "20 faults with a DN, and one subject";
    const auto shown = nlohmann::json::parse(run.out);
    EXPECT_EQ(shown["faults"].size(), 20u);
    EXPECT_EQ(shown["kinds"]["no-colon"], 30);
    for (const auto& fault : shown["faults"]) {
        const std::string dn = fault["dn"];
        EXPECT_TRUE(dn == "cn=" + std::string(16'381, 'x') + "... (100003 bytes)") << dn.size();
    }
}

TEST(LdifCheck, AFailureHalfWayEndsTheOutputProperly)
{
#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizer needs the memory itself";
#endif
    const temp_dir dir;
    std::string lines = "dn: cn=b\n";
    while (lines.size() < 15'000'000) {
        lines += "l: " + std::to_string(lines.size()) + "\n";
    }
    const std::string many = dir.write("many", "dn: cn=a\nl: 1\nl: 1\n\n" + lines);
    const std::string other = dir.write("other", "dn: cn=c\n");
    const words little_memory = {"prlimit", "--data=" + std::to_string(std::size_t{100} << 20)};
    const words endless_stacks = {"prlimit", "--stack=" + std::to_string(std::size_t{1} << 47)};
    const struct {
        words call;
        words in_front;
        const char* text;
        std::size_t results;  // what came before
        const char* member;
    } cases[] = {
        {{"check", "--threads", "1", many}, little_memory, "not enough memory", 2, "faults"},
        {{"check", "--threads", "2", many}, little_memory, "not enough memory", 2, "faults"},
        {{"check", "--threads", "2", many}, endless_stacks, "can't start a thread: ", 0, "faults"},
        {{"search", "--threads", "2", many, "(l=*)"}, little_memory, "not enough memory", 1, "entries"},
        {{"search", "--threads", "2", many, "(l=*)"}, endless_stacks, "can't start a thread: ", 0, "entries"},
        {{"print", many}, little_memory, "not enough memory", 1, "entries"},
    };
    for (const auto& c : cases) {
        const tool_run run = run_tool(joined({"ldif"}, joined(c.call, {"--json"})), {.in_front = c.in_front});
        EXPECT_EQ(run.status, 2) << c.call[0] << c.text;
        EXPECT_THAT(run.err, HasSubstr(c.text)) << c.call[0];
        const auto shown = nlohmann::json::parse(run.out, nullptr, false);
        ASSERT_TRUE(shown.is_object()) << c.call[0] << c.text << run.out.substr(0, 1000);
        EXPECT_EQ(shown["ok"], false);
        EXPECT_THAT(shown["error"]["text"], StartsWith(c.text));
        EXPECT_EQ(shown[c.member].size(), c.results) << c.call[0] << c.text;
        EXPECT_EQ(run_tool(joined({"ldif"}, c.call), {.in_front = c.in_front}).status, 2);
    }
}

TEST(LdifCheck, WhatCannotBeReadOrWrittenGivesTwo)
{
    const temp_dir dir;
    const std::string file = dir.write("in", "dn: o=x\n");
    const struct {
        words call;
        const char* message;
        run_settings settings = {};
    } cases[] = {
        {{dir.path("absent")}, "absent: No such file or directory"},
        {{dir.path()}, "a directory, where a file is expected"},
        {{"--rejects", file, file}, "in: the rejects can't go to the input"},
        {{"--rejects", "/dev/full", file}, "/dev/full: No space left on device"},
        {{"--rejects", dir.path("no/folder"), file}, "no/folder: No such file or directory"},
        {{file}, "standard output: No space left on device", {.output_path = "/dev/full"}},
        {{"--threads", "0", file}, "--threads"},
        {{"--mode", "5", file}, "--mode"},
        {{}, "FILE is required"},
    };
    for (const auto& c : cases) {
        words call = {"ldif", "check"};
        call.insert(call.end(), c.call.begin(), c.call.end());
        const tool_run run = run_tool(call, c.settings);
        EXPECT_EQ(run.status, 2) << c.message;
        EXPECT_THAT(run.err, HasSubstr(c.message));
    }
    EXPECT_EQ(dir.read("in"), "dn: o=x\n");
    const tool_run failed = run_tool({"ldif", "check", "--json", "--rejects", "/dev/full", file});
    EXPECT_EQ(failed.status, 2);
    const auto shown = nlohmann::json::parse(failed.out);
    EXPECT_EQ(shown["ok"], false);
    EXPECT_EQ(shown["error"]["file"], "/dev/full");
}
