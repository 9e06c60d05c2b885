// dirbase ldif search: which entries match, what is printed of them, and input of every kind and size.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <map>
#include <nlohmann/json.hpp>
#include <random>
#include <sstream>

#include "tests/tools/dirbase/run_tool.h"

using test_support::file_text;
using test_support::temp_dir;
using testing::AllOf;
using testing::ContainsRegex;
using testing::EndsWith;
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

const std::string sample = std::string(DIRBASE_SOURCE_SCHEMA_DIR) + "/../sample/organisation.ldif";

tool_run search(const std::string& file, const words& arguments, const run_settings& settings = {})
{
    return run_tool(joined({"ldif", "search", file}, arguments), settings);
}

tool_run search_text(const std::string& text, const words& arguments)
{
    return search("-", arguments, {.input = text});
}

std::string folded_case(std::string text)
{
    std::transform(text.begin(), text.end(), text.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
    return text;
}

std::string decoded(const std::string& base64)
{
    const std::string alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string bytes;
    unsigned bits = 0;
    int count = 0;
    for (const char c : base64.substr(0, base64.find('='))) {
        bits = bits << 6 | static_cast<unsigned>(alphabet.find(c));
        count += 6;
        if (count >= 8) {
            count -= 8;
            bytes += static_cast<char>(bits >> count & 0xFF);
        }
    }
    return bytes;
}

// An entry of the sample, read by the plainest means: lines, unfolded and decoded, in lower case.
struct plain_entry {
    std::string dn;
    std::multimap<std::string, std::string> values;

    bool has(const std::string& type) const { return values.contains(type); }
    bool any(const std::string& type, const std::function<bool(const std::string&)>& test) const
    {
        const auto [first, last] = values.equal_range(type);
        return std::any_of(first, last, [&test](const auto& value) { return test(value.second); });
    }
    bool is(const std::string& type, const std::string& text) const
    {
        return any(type, [&text](const std::string& value) { return value == text; });
    }
};

std::vector<plain_entry> plain_entries(const std::string& text)
{
    std::vector<plain_entry> entries;
    std::string unfolded = text;
    for (std::size_t at = 0; (at = unfolded.find("\n ", at)) != std::string::npos;) {
        unfolded.erase(at, 2);
    }
    std::istringstream lines(unfolded);
    for (std::string line; std::getline(lines, line);) {
        const std::size_t colon = std::min(line.find(':'), line.size());
        const std::string rest = line.substr(std::min(colon + 1, line.size()));
        const std::string type = folded_case(line.substr(0, colon));
        const std::string value = folded_case(
            rest.starts_with(": ") ? decoded(rest.substr(2)) : rest.substr(std::min<std::size_t>(1, rest.size())));
        if (type == "dn") {
            entries.push_back({value, {}});
        } else if (!entries.empty() && !line.empty() && line[0] != '#') {
            entries.back().values.emplace(type, value);
        }
    }
    return entries;
}

words dns_of(const std::string& ldif)
{
    words dns;
    for (const plain_entry& entry : plain_entries(ldif)) {
        dns.push_back(entry.dn);
    }
    return dns;
}

std::string parent_of(const std::string& dn)
{
    std::size_t comma = dn.find(',');
    while (comma != std::string::npos && dn[comma - 1] == '\\') {
        comma = dn.find(',', comma + 1);
    }
    return comma == std::string::npos ? "" : dn.substr(comma + 1);
}

// Entries of which some can't be read, in many batches.
std::string mixed_entries(std::size_t count)
{
    std::mt19937 random(11);
    std::string text;
    for (std::size_t i = 0; i < count; ++i) {
        text += "dn: cn=d" + std::to_string(i) +
                ",o=x\nobjectClass: device\nserialNumber: " + std::to_string(random() % 100) + "\n";
        const char* const more[] = {"", "", "", "no colon\n", "jpegPhoto: x\n", "dn: o=x\n", "cn:: w7w=\n"};
        text += more[random() % std::size(more)];
        text += "\n";
    }
    return text;
}

}  // namespace

TEST(LdifSearch, WhatMatchesInTheSampleIsWhatAPlainScanFinds)
{
    using entry = plain_entry;
    const auto begins = [](const char* text) {
        return [text](const std::string& value) { return value.starts_with(text); };
    };
    const auto holds = [](const char* text) {
        return [text](const std::string& value) { return value.find(text) != std::string::npos; };
    };
    const struct {
        const char* filter;
        std::function<bool(const entry&)> matches;
    } cases[] = {
        {"(objectClass=*)", [](const entry&) { return true; }},
        {"(objectClass=Person)", [](const entry& e) { return e.is("objectclass", "person"); }},
        {"(!(objectclass=PERSON))", [](const entry& e) { return !e.is("objectclass", "person"); }},
        {"(manager=*)", [](const entry& e) { return e.has("manager"); }},
        {"(pager=*)", [](const entry&) { return false; }},
        {"sn=Nettle*", [&](const entry& e) { return e.any("sn", begins("nettle")); }},
        {"(cn=*a*e*)",
         [](const entry& e) {
             return e.any("cn", [](const std::string& value) {
                 const std::size_t a = value.find('a');
                 return a != std::string::npos && value.find('e', a) != std::string::npos;
             });
         }},
        {"(mail=*quillhaven.example)", [&](const entry& e) { return e.any("mail", holds("quillhaven.example")); }},
        {"(employeeType=staff)", [](const entry& e) { return e.is("employeetype", "staff"); }},
        {"(uid>=x)",
         [](const entry& e) { return e.any("uid", [](const std::string& value) { return value >= "x"; }); }},
        {"(uid<=c)",
         [](const entry& e) { return e.any("uid", [](const std::string& value) { return value <= "c"; }); }},
        {"(uidNumber>=20040)",
         [](const entry& e) {
             return e.any("uidnumber", [](const std::string& value) { return std::stoi(value) >= 20040; });
         }},
        {"(manager= UID = lotteryard , ou=PEOPLE;o=quillhaven works)",
         [](const entry& e) { return e.is("manager", "uid=lotteryard,ou=people,o=quillhaven works"); }},
        {"(uniqueMember=uid=lotteryard,ou=People,o=Quillhaven Works)",
         [](const entry& e) { return e.is("uniquemember", "uid=lotteryard,ou=people,o=quillhaven works"); }},
        {"(&(objectClass=posixAccount)(|(title=Clerk)(roomNumber=Tower*))(!(ou=Glass House)))",
         [&](const entry& e) {
             return e.is("objectclass", "posixaccount") &&
                    (e.is("title", "clerk") || e.any("roomnumber", begins("tower"))) && !e.is("ou", "glass house");
         }},
        {"(|(nonesuch=x)(sn=Kettlequist))", [](const entry& e) { return e.is("sn", "kettlequist"); }},
        {"(title;lang-de=*)", [](const entry& e) { return e.has("title;lang-de"); }},
        {"(&(sn=a)(jpegPhoto=x))", [](const entry&) { return false; }},
    };
    const std::vector<plain_entry> entries = plain_entries(file_text(sample));
    ASSERT_EQ(entries.size(), 358u);
    for (const auto& c : cases) {
        words expected;
        for (const plain_entry& at : entries) {
            if (c.matches(at)) {
                expected.push_back(at.dn);
            }
        }
        const int status = expected.empty() ? 1 : 0;
        const tool_run listed = search(sample, {c.filter, "1.1"});
        EXPECT_EQ(dns_of(listed.out), expected) << c.filter;
        EXPECT_EQ(listed.status, status) << c.filter << listed.err;
        const tool_run counted = search(sample, {"--count", c.filter});
        EXPECT_EQ(counted.out, std::to_string(expected.size()) + "\n") << c.filter;
        EXPECT_EQ(counted.status, status) << c.filter;
    }
}

TEST(LdifSearch, ScopesAreThoseOfASearchRequest)
{
    const std::vector<plain_entry> entries = plain_entries(file_text(sample));
    for (const char* base : {"ou=people,o=quillhaven works", "o=quillhaven works", "", "ou=nobody,o=quillhaven works",
                             "uid=lotteryard,ou=people,o=quillhaven works"}) {
        std::map<std::string, words> expected;
        for (const plain_entry& entry : entries) {
            const std::string of_base = std::string(",") + base;
            if (entry.dn == base) {
                expected["base"].push_back(entry.dn);
            }
            if (parent_of(entry.dn) == base) {
                expected["one"].push_back(entry.dn);
            }
            if (*base == '\0' || ("," + entry.dn).ends_with(of_base)) {
                expected["sub"].push_back(entry.dn);
            }
        }
        for (const char* scope : {"base", "one", "SUB"}) {
            const tool_run run = search(sample, {"--base", base, "--scope", scope, "(objectClass=*)", "1.1"});
            EXPECT_EQ(dns_of(run.out), expected[folded_case(scope)]) << base << scope << run.err;
        }
        EXPECT_EQ(dns_of(search(sample, {"--base", base, "(objectClass=*)"}).out), expected["sub"]) << base;
    }
    // Every spelling of a base is the same one; what only looks like its end isn't below it.
    const std::string text =
        "dn: cn=a,o=x\ncn: a\n\ndn: cn=b\\,o=x\ncn: b\n\ndn: cn=c,oo=x\ncn: c\n\ndn: 2.5.4.10=X\no: x\n";
    EXPECT_EQ(search_text(text, {"--base", " O = x ", "(|(cn=*)(o=*))", "1.1"}).out,
              "dn: cn=a,o=x\n\ndn: 2.5.4.10=X\n");
    EXPECT_EQ(search_text(text, {"--base", "organizationName=X", "--scope", "one", "(cn=*)", "1.1"}).out,
              "dn: cn=a,o=x\n");
}

TEST(LdifSearch, AttributesArePrintedByAnyOfTheirNames)
{
    const std::string entry =
        "dn:: Y249YQ==\nCN: a\ncommonName;lang-de: b\n2.5.4.4: s\ncn: c\ndescription:: w7w=\nx-own: 1\n"
        "jpegPhoto:: AP8=\n";
    const std::string all = entry.substr(entry.find('\n') + 1);
    const struct {
        words names;
        std::string out;
    } cases[] = {
        {{}, all},
        {{"*"}, all},
        {{"1.1"}, ""},
        {{"1.1", "sn"}, "2.5.4.4: s\n"},
        {{"cn"}, "CN: a\ncommonName;lang-de: b\ncn: c\n"},
        {{"2.5.4.3"}, "CN: a\ncommonName;lang-de: b\ncn: c\n"},
        {{"CN;LANG-DE", "surname"}, "commonName;lang-de: b\n2.5.4.4: s\n"},
        {{"cn;lang-en"}, ""},
        {{"X-OWN", "jpegphoto"}, "x-own: 1\njpegPhoto:: AP8=\n"},
        {{"nonesuch"}, ""},
    };
    for (const auto& c : cases) {
        words call = {"(cn=a)"};
        call.insert(call.end(), c.names.begin(), c.names.end());
        const tool_run run = search_text(entry, call);
        EXPECT_EQ(run.out, "dn: cn=a\n" + c.out) << testing::PrintToString(c.names);
        EXPECT_EQ(run.status, 0);
    }
    EXPECT_EQ(search_text(entry, {"(cn=a)", "nonesuch"}).err, "note: the schema has no attribute \"nonesuch\"\n");
    const auto shown = nlohmann::json::parse(search_text(entry, {"--json", "(cn=a)", "cn", "jpegPhoto"}).out);
    EXPECT_EQ(shown, nlohmann::json::parse(
                         R"({"entries": [{"dn": "cn=a", "attributes": {"CN": ["a", "c"], "commonName;lang-de": ["b"],
                             "jpegPhoto": [{"base64": "AP8="}]}}], "count": 1, "ok": true})"));
}

TEST(LdifSearch, WhatIsPrintedIsTheSameData)
{
    const temp_dir dir;
    const std::string found = search(sample, {"(objectClass=*)"}).out;
    const std::string file = dir.write("found", found);
    EXPECT_EQ(run_tool({"ldif", "diff", sample, file}).status, 0);
    EXPECT_EQ(search(file, {"(!(pager=*))"}).out, found);
    EXPECT_THAT(found, Not(ContainsRegex("[^\n]{78}"))) << "long lines are folded";
    const auto shown = nlohmann::json::parse(search(sample, {"--json", "(!(pager=*))"}).out);
    EXPECT_EQ(shown["count"], 358);
    EXPECT_EQ(shown["entries"].size(), 358u);
}

TEST(LdifSearch, AnyNumberOfThreadsSaysTheSame)
{
    const temp_dir dir;
    const std::string file = dir.write("in", mixed_entries(20'000));
    for (const words& options : {words{}, {"--json"}, {"--count"}, {"--count", "--json"}, {"--limit", "1234"}}) {
        std::pair<std::string, std::string> expected;
        for (const char* threads : {"1", "2", "7"}) {
            words call = options;
            call.insert(call.end(), {"--threads", threads, "(|(serialNumber=1*)(jpegPhoto=x)(serialNumber>=97))"});
            const tool_run run = search(file, call);
            EXPECT_EQ(run.status, 0) << run.err.substr(0, 200);
            EXPECT_GT(lines_of(run.err).size(), 100u);
            const std::pair<std::string, std::string> result = {run.out, run.err};
            expected = expected.first.empty() ? result : expected;
            EXPECT_TRUE(result == expected) << threads << testing::PrintToString(options);
        }
    }
}

TEST(LdifSearch, ALimitEndsTheSearchAndTheReading)
{
    const temp_dir dir;
    const std::string file = dir.write("in", mixed_entries(5'000));
    const std::string all = search(file, {"(cn=*)"}).out;
    const words dns = dns_of(all);
    ASSERT_GT(dns.size(), 500u);
    for (const std::size_t limit : {std::size_t{1}, std::size_t{2}, dns.size() - 1, dns.size(), dns.size() + 1}) {
        const tool_run run = search(file, {"--limit", std::to_string(limit), "(cn=*)"});
        const std::size_t count = std::min(limit, dns.size());
        EXPECT_EQ(dns_of(run.out), words(dns.begin(), dns.begin() + static_cast<std::ptrdiff_t>(count)));
        EXPECT_TRUE(all.starts_with(run.out));
        EXPECT_EQ(search(file, {"--count", "--limit", std::to_string(limit), "(cn=*)"}).out,
                  std::to_string(count) + "\n");
    }
    const tool_run quiet = search_text("dn: cn=a\ncn: a\n\ndn: cn=b\nno colon\n", {"--limit", "1", "(cn=*)"});
    EXPECT_EQ(quiet.err, "") << "what stands behind the last match isn't looked at";

    // The writer of this pipe goes on holding it.
    const std::string pipe = dir.path("pipe");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int end = open(pipe.c_str(), O_RDWR);
    const std::string text = "dn: cn=a\ncn: a\n\ndn: cn=b\ncn: b\n\n";
    for (const char* threads : {"1", "3"}) {
        ASSERT_EQ(write(end, text.data(), text.size()), static_cast<ssize_t>(text.size()));
        const tool_run run =
            search(pipe, {"--limit", "1", "--threads", threads, "(cn=a)"}, {.in_front = {"timeout", "60"}});
        EXPECT_EQ(run.status, 0) << threads;
        EXPECT_EQ(run.out, "dn: cn=a\ncn: a\n");
    }
    close(end);
}

TEST(LdifSearch, WhatCannotBeReadOrEvaluatedIsToldAndPassedOver)
{
    const std::string good = "dn: cn=a\ncn: a\nobjectClass: device\n\n";
    const struct {
        std::string text;
        const char* filter;
        const char* out;
        const char* err;
        int status;
    } cases[] = {
        {"", "(cn=a)", "", "", 1},
        {"\n\n# none\n\nversion: 1\n", "(cn=a)", "", "", 1},
        {"dn: cn=b\ncn\n\n" + good, "(cn=*)", "dn: cn=a\n",
         "standard input:2: cn=b: no \":\" in \"cn\"; the entry is passed over\n", 0},
        {good + "cn: c\n", "(cn=*)", "dn: cn=a\n", "standard input:5: no DN: ", 0},
        {good + "dn: x=c\ncn: c\n", "(cn=*)", "dn: cn=a\n", "standard input:5: x=c: dn: 17 undefinedAttributeType", 0},
        {good + "dn: cn=b\nchangetype: delete\n", "(cn=*)", "dn: cn=a\n", "standard input:6: cn=b: changetype: ", 0},
        {good + "dn: cn=b\njpegPhoto: x\n", "(jpegPhoto=x)", "",
         "2 entries: the filter can't be evaluated: Not supported (", 1},
        {good + "dn: cn=b\njpegPhoto: x\n", "(&(cn=b)(jpegPhoto=x))", "", "", 1},
        {good + "dn: cn=b\njpegPhoto: x\n", "(|(cn=a)(jpegPhoto=x))", "dn: cn=a\n",
         "1 entry: the filter can't be evaluated: Not supported (", 0},
        {good, "(uidNumber=1*)", "", "1 entry: the filter can't be evaluated: Bad search filter (", 1},
        {good, "(nonesuch=a)", "",
         "the filter is undefined, so no entry matches it\nnote: equality nonesuch = a is undefined: the schema has",
         1},
        {good, "(|(cn=a)(nonesuch=a))", "dn: cn=a\n", "note: equality nonesuch = a is undefined: the schema has", 0},
        {good, "(!(nonesuch=a))", "", "the filter is undefined", 1},
        {good, "(cn=**)", "", "the filter is refused: 21 ", 2},
        {good, "(|(nonesuch=a)(xan-taxNumber=1))", "",
         "the filter is refused: 53 unwillingToPerform: The attribute xan-taxNumber can not be used in search "
         "filters.\nnote: the element is: equality xan-taxNumber = 1\n",
         2},
        {good, "(cn=a", "", "no filter: at byte 0: the parenthesis isn't closed\n", 2},
        {good, "", "", "no filter: at byte 0: ", 2},
    };
    for (const auto& c : cases) {
        const tool_run run = search_text(c.text, {c.filter, "1.1"});
        EXPECT_EQ(run.out, c.out) << c.text << c.filter;
        EXPECT_THAT(run.err, StartsWith(c.err)) << c.text << c.filter;
        EXPECT_EQ(run.err.empty(), *c.err == '\0') << run.err;
        EXPECT_EQ(run.status, c.status) << c.text << c.filter;
        const tool_run as_json = search_text(c.text, {"--json", c.filter});
        EXPECT_EQ(as_json.status, c.status);
        EXPECT_EQ(nlohmann::json::parse(as_json.out)["ok"], c.status == 0) << c.filter;
    }
    const auto shown = nlohmann::json::parse(
        search_text(good + "dn: cn=b\njpegPhoto: x\n", {"--json", "(|(nonesuch=a)(jpegPhoto=x))"}).out);
    EXPECT_EQ(shown["unevaluated"][0]["entries"], 2);
    EXPECT_EQ(shown["unevaluated"][0]["result"], 92);
    EXPECT_EQ(shown["undefined"].size(), 1u);
    EXPECT_EQ(shown["entries"].size(), 0u);
}

TEST(LdifSearch, WrongCallsAndFilesGiveTwo)
{
    const temp_dir dir;
    const std::string file = dir.write("in", "dn: cn=a\ncn: a\n");
    const struct {
        words call;
        const char* message;
        run_settings settings = {};
    } cases[] = {
        {{dir.path("absent"), "(cn=a)"}, "absent: No such file or directory"},
        {{dir.path(), "(cn=a)"}, "a directory, where a file is expected"},
        {{file}, "FILTER is required"},
        {{file, "(cn=a)", "--limit", "0"}, "--limit"},
        {{file, "(cn=a)", "--threads", "65"}, "--threads"},
        {{file, "(cn=a)", "--scope", "one"}, "--base"},
        {{file, "(cn=a)", "--base", "o=x", "--scope", "near"}, "near"},
        {{file, "(cn=a)", "--base", "nonesuch=x"}, "the base is refused: 17 undefinedAttributeType at byte 0"},
        {{file, "(cn=a)"}, "standard output: No space left on device", {.output_path = "/dev/full"}},
        {{file, "(cn=a)", "--count"}, "standard output: No space left on device", {.output_path = "/dev/full"}},
    };
    for (const auto& c : cases) {
        words call = {"ldif", "search"};
        call.insert(call.end(), c.call.begin(), c.call.end());
        const tool_run run = run_tool(call, c.settings);
        EXPECT_EQ(run.status, 2) << c.message;
        EXPECT_THAT(run.err, HasSubstr(c.message));
    }
}

TEST(LdifSearch, InputOfAnySizeGetsAnAnswerInLittleMemory)
{
#if defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "much text, which ThreadSanitizer follows byte by byte";
#endif
    const temp_dir dir;
    const std::string good = "\n\ndn: cn=a\ncn: a\n";
    std::string tags = "dn: cn=m\n";
    for (int i = 0; i < 12'000; ++i) {
        tags += "x" + std::to_string(i) + ": 1\n";
    }
    const struct {
        std::string text;
        const char* told;
        const char* count;
    } cases[] = {
        {"dn: cn=b\ncn: " + std::string(100'000'000, 'x'),
         "huge:3: cn=b: an entry of 100000015 bytes, more than 16777216", "1\n"},
        {std::string(50'000'000, '\n') + "x", "huge:50000003: no \":\" in \"x\"", "1\n"},
        {"dn: cn=b\ncn: " + std::string(16'000'000, 'x'), "", "2\n"},
        {tags, "huge:3: cn=m: more than 10000 attributes", "1\n"},
        {mixed_entries(200'000), "entry is passed over", ""},
    };
    for (const auto& c : cases) {
        const std::string file = dir.write("huge", "\n\n" + c.text + good);
        run_settings settings;
#if !defined(__SANITIZE_ADDRESS__)
        settings.in_front = {"prlimit", "--data=" + std::to_string(std::size_t{130} << 20)};
#endif
        const tool_run run = search(file, {"--threads", "1", "--count", "(cn=*)"}, settings);
        EXPECT_EQ(run.status, 0) << run.err.substr(0, 1000);
        EXPECT_THAT(run.out, EndsWith(c.count));
        EXPECT_TRUE(run.err.find(c.told) != std::string::npos) << run.err.substr(0, 1000);
        EXPECT_EQ(run.err.empty(), *c.told == '\0');
    }
    const std::string long_value(100'000, 'x');
    EXPECT_THAT(search_text("dn: cn=a\ncn: a\n", {"(cn=" + long_value + ")"}).err, HasSubstr("longer than the"));
    EXPECT_THAT(search_text("dn: cn=a\ndescription: a\n", {"(description=*" + std::string(600, 'x') + "*)"}).err,
                HasSubstr("1 entry: the filter can't be evaluated: Operations error (most likely the pieces"));
}

TEST(LdifSearch, WhatIsNoLdifAtAllIsToldInFewWords)
{
    std::mt19937 random(1);
    std::string noise(1'000'000, '\0');
    for (char& c : noise) {
        c = static_cast<char>(random());
    }
    const tool_run run = search_text(noise, {"(cn=*)"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.out, "");
    EXPECT_THAT(run.err, AllOf(HasSubstr("passed over"), Not(ContainsRegex("[\x01-\x09\x0b-\x1f]"))));
}
