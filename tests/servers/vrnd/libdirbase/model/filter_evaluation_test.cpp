// Evaluation of filters: tables, each row of which a slow evaluator must agree with, and threads.
#include <atomic>
#include <thread>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/support/message_catcher.h"
#include "tests/support/slow_filter.h"

using model_test::evaluate;
using model_test::filled_entry;
using model_test::filter_of;
using model_test::test_entry;

namespace {

class FilterEvaluation : public model_test::Filters {};

struct evaluation {
    std::string filter;
    int result;
};

void expect_results(const Entry& entry, const std::vector<evaluation>& table)
{
    const std::string before = model_test::described(entry);
    for (const auto& [text, result] : table) {
        const filter_guard filter = filter_of(text);
        EXPECT_EQ(test_filter(&entry, filter.get()), result) << text;
        EXPECT_EQ(test_support::slow_test_filter(entry, filter.get()), result) << text << " (slow)";
    }
    EXPECT_EQ(model_test::described(entry), before);
}

const std::initializer_list<model_test::attribute_values> person = {
    {"objectClass", {"top", "employee"}},
    {"cn;lang-de", {"M\xc3\xbcller", "a"}},
    {"cn", {"A X B", "Tymczak"}},
    {"cn;lang-en", {"miller"}},
    {"sn", {"Smyth"}},
    {"description", {"ABC", "a.c"}},
    {"member", {"cn=Bob , sn=Acme", "cn=\"c,;+\",sn=a"}},
    {"uniqueMember;lang-en", {"cn=x"}},
    {"number", {"-5", "10"}},
    {"flag", {"TRUE"}},
    {"bits", {"'0101'B"}},
    {"digits", {"12 "}},
    {"time", {"20240101000000Z"}},
    {"utc", {"240101000000Z"}},
    {"tel", {"+1 555-0100", " -7"}},
    {"cert", {"\x01\x02"}},
    {"ref", {"CaseS"}},
};

TEST_F(FilterEvaluation, ComparisonsFollowTheSyntaxWithATreeAndWithout)
{
    for (const bool trees : {false, true}) {
        const filled_entry entry(person, trees);
        ASSERT_EQ(entry.find("cn")->a_tree != nullptr, trees);
        const std::vector<evaluation> table = {
            {"(cn=a x b)", 0},
            {"(commonName=A X B)", 0},
            {"(2.5.4.3=a x b)", 0},
            {"(cn=a  x b)", -1},
            {"(cn=TYMCZAK)", 0},
            {"(cn=)", -1},
            {"(ref=CaseS)", 0},
            {"(ref=cases)", -1},
            {"(ref=Case*)", 0},
            {"(ref=case*)", -1},
            {"(member=CN=bob,SN=acme)", 0},
            {"(member=cn=bob)", -1},
            {"(member=cn=bob*)", 0},
            {"(member=*,sn=*)", 0},
            {"(member=*sn=acme)", 0},
            {"(member=cn=c\\,\\;\\+*)", 0},  // longer in its normal form than as stored
            {"(member=cn=b*\\;*)", -1},
            {"(number=10)", 0},
            {"(number=010)", 0},
            {"(number>=10)", 0},
            {"(number>=11)", -1},
            {"(number<=-5)", 0},
            {"(number<=-6)", -1},
            {"(number=9)", -1},
            {"(flag=true)", 0},
            {"(flag=FALSE)", -1},
            {"(sn>=smyth)", 0},
            {"(sn>=smz)", -1},
            {"(sn<=smyth)", 0},
            {"(sn<=smyt)", -1},
            {"(time=20240101013000+0130)", 0},
            {"(time>=20240101000000Z)", 0},
            {"(time>=20240101000000.5Z)", -1},
            {"(time<=20231231235959Z)", -1},
            {"(utc=2401010000Z)", 0},
            {"(utc<=2312312359Z)", -1},
            {"(tel=+15550100)", 0},
            {"(tel=+1-5 55*)", 0},
            {"(tel=*-0100)", 0},
            {"(tel=7*)", 0},
            {"(objectClass=EMPLOYEE)", 0},
            {"(objectClass=worker)", -1},
            {"(uniqueMember=cn=x)", 0},
            {"(bits='0101'B)", 0},
            {"(bits='1'B)", -1},
            {"(digits= 12)", 0},
        };
        expect_results(entry, table);
        // Only a tree refuses what is no value.
        expect_results(entry, {{"(number=abc)", trees ? 1 : -1},
                               {"(!(number=abc))", trees ? 1 : 0},
                               {"(|(time=x)(cn=*))", trees ? 1 : 0},
                               {"(member=bob)", trees ? 1 : -1},
                               {"(bits=2)", trees ? 1 : -1},
                               {"(flag=\\1a)", trees ? 1 : -1},  // "t" less 90, which isn't the result of that number
                               {"(number>=abc)", 0}});
    }
}

TEST_F(FilterEvaluation, ATypeWithoutATagStandsForAllVersionsAndOneWithATagForItsOwn)
{
    const filled_entry entry(person);
    const std::vector<evaluation> table = {
        {"(cn=miller)", 0},
        {"(cn=a)", 0},
        {"(cn;lang-en=miller)", 0},
        {"(CN;LANG-EN=miller)", 0},
        {"(cn;lang-de=miller)", -1},
        {"(cn;lang-en=a x b)", -1},
        {"(cn;lang-en=mi*er)", 0},
        {"(cn;lang-de=mi*er)", -1},
        {"(cn;lang-de=m\xc3\x9c*)", 0},
        {"(cn;lang-de~=tymczak)", -1},
        {"(cn;lang-en~=mueller)", 0},
        {"(cn;lang-en>=n)", -1},
        {"(cn>=t)", 0},
        {"(cn;lang-fr=*)", -1},
        {"(cn;lang-de=*)", 0},
        {"(sn;lang-de=*)", -1},
        {"(sn;lang-de=smyth)", -1},
        {"(uniqueMember;lang-de=cn=x)", 0},  // the record that is kept at hand
    };
    expect_results(entry, table);
    expect_results(filled_entry({{"cn;lang-de", {"a"}}}),
                   {{"(cn=a)", 0}, {"(cn=*)", 0}, {"(cn;lang-en=a)", -1}, {"(cn;lang-en=*)", -1}, {"(cn~=a)", 0}});
}

TEST_F(FilterEvaluation, WhatCantBeToldPassesThroughNegationsAndEndsLists)
{
    const filled_entry entry(person);
    const std::vector<evaluation> table = {
        {"(flag>=TRUE)", 87},
        {"(flag<=TRUE)", 87},
        {"(!(flag>=TRUE))", 87},
        {"(!(!(flag>=TRUE)))", 87},
        {"(cert=a)", 92},
        {"(cert>=a)", 92},
        {"(cert=*)", 0},
        {"(|(cert=a)(cn=*))", 92},
        {"(|(cn=*)(cert=a))", 0},
        {"(|(a=x)(cert=a)(flag>=x))", 92},
        {"(&(cn=*)(cert=a)(a=x))", 92},
        {"(&(a=x)(cert=a))", -1},
        {"(!(&(a=x)(cert=a)))", 0},
        {"(&(cn=*)(sn=*))", 0},
        {"(&(cn=*)(sn=x))", -1},
        {"(|(cn=x)(sn=x))", -1},
        {"(&)", -1},
        {"(|)", -1},
        {"(!(|))", 0},
        {"(!)", 1},
        {"(!(cn=*)(sn=x))", -1},
        {"(number~=1)", 87},
        {"(flag~=TRUE)", 87},
        {"(cert~=a)", 87},
        {"(time~=2)", 87},
        {"(utc~=2)", 87},
        {"(number=1*)", 87},
        {"(flag=T*)", 87},
        {"(cert=a*)", 87},
        {"(time=2*)", 87},
        {"(utc=2*)", 87},
    };
    expect_results(entry, table);
    {
        const std::vector<evaluation> of_nothing = {
            {"(cn=a)", -1},  {"(!(cn=a))", 0}, {"(cn=*)", -1},   {"(!(cn=*))", 0},  {"(cn>=a)", -1},
            {"(cn~=a)", -1}, {"(cn=*a*)", -1}, {"(cert=a)", 92}, {"(flag>=a)", 87}, {"(number=1*)", 87},
        };
        expect_results(test_entry(), of_nothing);
    }
    test_entry without_values;
    Attribute* attr = nullptr;
    ASSERT_EQ(flatattr_insert(&without_values, model_test::info_of("cn"), "cn", &attr, nullptr), 0);
    expect_results(without_values, {{"(cn=*)", 0}, {"(cn=)", -1}, {"(cn=**)", -1}, {"(cn<=a)", -1}, {"(cn~=a)", -1}});
}

TEST_F(FilterEvaluation, UnknownChoicesAndMissingArgumentsAreFailures)
{
    const filled_entry entry(person);
    const filter_guard equality = filter_of("(sn=smyth)");
    EXPECT_EQ(test_filter(nullptr, equality.get()), 1);
    EXPECT_EQ(test_filter(&entry, nullptr), 1);
    EXPECT_EQ(test_filter(nullptr, filter_of("(!(cn=*))").get()), 1);
    EXPECT_EQ(test_filter_list(&entry, equality.get(), LDAP_FILTER_AND), 0);
    EXPECT_EQ(test_filter_list(&entry, nullptr, LDAP_FILTER_AND), -1);
    EXPECT_EQ(test_filter_list(&entry, equality.get(), LDAP_FILTER_NOT), 1);
    EXPECT_EQ(test_filter_list(nullptr, equality.get(), LDAP_FILTER_OR), 1);
    EXPECT_EQ(test_ava_filter(&entry, nullptr, LDAP_FILTER_EQUALITY), 1);
    EXPECT_EQ(test_ava_filter(nullptr, &equality->f_ava, LDAP_FILTER_GE), 1);
    EXPECT_EQ(test_ava_filter(&entry, &equality->f_ava, LDAP_FILTER_APPROX), 1);
    EXPECT_EQ(test_presence_filter(nullptr, "cn"), -1);
    EXPECT_EQ(test_presence_filter(&entry, nullptr), -1);
    EXPECT_EQ(test_approx_filter(&entry, nullptr), 1);
    EXPECT_EQ(test_approx_filter(nullptr, &equality->f_ava), 1);
    EXPECT_EQ(test_substring_filter(&entry, nullptr), 1);
    Filter nothing = {};
    for (const std::uint64_t choice : {LDAP_FILTER_EQUALITY, LDAP_FILTER_GE, LDAP_FILTER_LE, LDAP_FILTER_APPROX,
                                       LDAP_FILTER_SUBSTRINGS, LDAP_FILTER_NOT, LDAP_FILTER_EXTENDED}) {
        nothing.f_choice = choice;
        EXPECT_EQ(test_filter(&entry, &nothing), 1) << choice;
    }
    const test_support::debug_catcher debug;
    nothing.f_choice = 0x1'0000'00a3;  // all its bits count
    EXPECT_EQ(test_filter(&entry, &nothing), 1);
    nothing.f_choice = LDAP_FILTER_EXTENDED;
    EXPECT_EQ(test_filter(&entry, &nothing), 1);
    EXPECT_TRUE(debug.has("    unknown filter type 169\n"));
}

TEST_F(FilterEvaluation, TheDeepestFilterIsNegatedOnEachLevel)
{
    const filled_entry entry(person);
    std::string text = "(cn=*)";
    for (unsigned depth = 1; depth < FILTER_MAX_DEPTH; ++depth) {
        text = "(!" + text + ")";
    }
    EXPECT_EQ(evaluate(entry, text), -1);
}

// ---- encrypted attributes -------------------------------------------------------------------------------------------

TEST_F(FilterEvaluation, PasswordsAreVerifiedAndOnlyThoseOfTheFirstVersion)
{
    test_entry entry;
    model_test::add_passwords(entry);
    ASSERT_EQ(entry.values("oneWay").find("SECRET"), std::string::npos);
    const std::string stored = model_test::text_of(*entry.find("oneWay")->a_vals[1]);
    const std::vector<evaluation> table = {
        {"(oneWay=secret)", 0},          {"(oneWay=first)", 0},
        {"(oneWay=secre)", -1},          {"(oneWay=other)", -1},  // of the second version
        {"(oneWay;lang-en=other)", 0},   {"(oneWay;lang-en=secret)", -1},
        {"(!(oneWay=secret))", -1},      {"(oneWay>={)", 0},  // orderings see what is stored
        {"(oneWay<=secret)", -1},        {"(oneWay=*)", 0},
        {"(oneWay=" + stored + ")", -1},  // a stored form is no password
    };
    expect_results(entry, table);
}

TEST_F(FilterEvaluation, DecodedValuesCountForEqualityWhereThereAreAny)
{
    test_entry entry;
    ASSERT_EQ(entry.merge("twoWay", {"secret", "other"}), 0);
    Attribute* const attr = entry.find("twoWay");
    ASSERT_EQ(attr_encode_attribute(attr), 0);
    ASSERT_EQ(attr->a_tree, nullptr);
    expect_results(entry, {{"(twoWay=secret)", -1}, {"(twoWay<=secret)", -1}});
    ASSERT_EQ(attr_create_decodedvals(attr), 0);
    expect_results(entry, {{"(twoWay=SECRET)", 0}, {"(twoWay=none)", -1}, {"(twoWay<=secret)", -1}});
    test_entry clear;
    ASSERT_EQ(clear.merge("twoWay", {model_test::text_of(*attr->a_vals[0]), "b"}, 1, 2), 0);
    ASSERT_NE(clear.find("twoWay")->a_tree, nullptr);
    expect_results(clear, {{"(twoWay=secret)", 0}, {"(twoWay=b)", 0}, {"(twoWay=other)", -1}});
}

// ---- substrings -----------------------------------------------------------------------------------------------------

int find_pieces(const std::string& value, const std::string& pieces)
{
    const filled_entry entry({{"description", {value}}});
    return evaluate(entry, "(description=" + pieces + ")");
}

TEST_F(FilterEvaluation, PiecesAreFoundInOrderWithoutOverlap)
{
    const std::string signs = R"($+.[\]^?(){}|)";
    const std::string with_zero("AB\0CD", 5);
    struct {
        std::string value;
        std::string pieces;
        int result;
    } const table[] = {
        {"A X B", "a*b", 0},
        {"A X B C", "a*b", -1},
        {"B A X B", "a*b", -1},
        {"ABC", "*b*", 0},
        {"ABC", "*c", 0},
        {"ABC", "*b", -1},
        {"ABC", "b*", -1},
        {"ABC", "ab*bc", -1},
        {"ABBC", "ab*bc", 0},
        {"AB", "ab*ab", -1},
        {"ABAB", "ab*ab", 0},
        {"ABAB", "*ab*ab*", 0},
        {"ABAB", "*ab*ab*b*", -1},
        {"ABAB", "*ab*ba*", -1},
        {"ABCABD", "*abd*", 0},
        {"ABAC", "a*a*c", 0},
        {"ABC", "a*b*c", 0},
        {"ABC", "a*c*c", -1},
        {"ABC", "a*a*c", -1},
        {"", "**", 0},
        {"", "a*", -1},
        {"ABC", "**", 0},
        {"ABC", "***b***", 0},
        {"ABC", "a.c*", -1},
        {"a.c", "a.c*", 0},
        {"ABC", "*[abc]*", -1},
        {"A", "a+*", -1},
        {signs, "*" + signs, 0},
        {signs, signs + "*", 0},
        {"x" + signs + "x", "*" + signs.substr(0, 5) + "*" + signs.substr(5) + "*", 0},
        {"one\ntwo", "one*two", 0},
        {"one\ntwo", "two*", -1},
        {"one\ntwo", "*one", -1},
        {"one\ntwo", "*ne\nt*", 0},
        {with_zero, "*b", 0},
        {with_zero, "*c*", -1},
        {"\xc3\xbc\xc3\xa4", "\xc3\x9c*", 0},
        {"\xc3\xbc\xc3\xa4", "*\xc3\x84", 0},
        {"\xd1\x80x", "\xd0\xa0*", 0},  // folding changes the first byte, too
        {"\xff"
         "abc",
         "*abc", -1},  // nothing behind what isn't UTF-8 is folded, in the value as in the piece
        {"\xff"
         "abc",
         "*\xff"
         "abc",
         0},
    };
    for (const auto& row : table) {
        EXPECT_EQ(find_pieces(row.value, row.pieces), row.result) << row.value << " " << row.pieces;
    }
}

TEST_F(FilterEvaluation, ValuesOfAnyLengthAreNormalizedOneAfterTheOther)
{
    for (std::size_t length = 505; length < 520; ++length) {
        const std::string longer = std::string(length, 'a') + "end";
        const filled_entry entry({{"description", {longer, "b" + longer, "short", std::string(3 * length, 'c')}}});
        expect_results(entry, {{"(description=a*aend)", 0},
                               {"(description=ba*end)", 0},
                               {"(description=short*)", 0},
                               {"(description=shorta*)", -1},
                               {"(description=c*c)", 0},
                               {"(description=" + longer + ")", 0},
                               {"(description=" + longer + "x)", -1}});
    }
    std::string dn = "cn=\"" + std::string(300, ',') + "\"";
    const filled_entry entry({{"member", {dn, "cn=a", dn + ",cn=b", "cn=short"}}});
    expect_results(entry, {{"(member=" + dn + ")", 0},
                           {"(member=*,CN=B)", 0},
                           {"(member=*short)", 0},
                           {"(member=*\\,)", 0},
                           {"(member=*\\,,cn=c)", -1}});
}

TEST_F(FilterEvaluation, PiecesHaveALimitedSpace)
{
    const auto signs = [](std::size_t count, char sign = 'x') { return std::string(count, sign); };
    struct {
        std::string pieces;
        int result;
    } const table[] = {
        {signs(510) + "*", -1},
        {signs(511) + "*", 1},
        {"*" + signs(510) + "*", 1},  // the initial piece is there, though empty
        {"*" + signs(509) + "*", -1},
        {signs(399) + "*" + signs(310), -1},
        {signs(399) + "*" + signs(311), 1},
        {"*" + signs(397) + "*" + signs(310), -1},
        {"*" + signs(398) + "*" + signs(310), 1},
        {signs(399) + "*" + signs(310) + "*", -1},
        {signs(399) + "*" + signs(311) + "*", 1},
        {signs(399, '.') + "*" + signs(110), -1},
        {signs(399, '.') + "*" + signs(111), 1},
        {signs(399, '?') + "*" + signs(310), -1},
        {signs(511, '*'), 0},
        {signs(512, '*'), 1},
    };
    for (const auto& row : table) {
        const test_support::debug_catcher debug;
        EXPECT_EQ(find_pieces("y", row.pieces), row.result) << row.pieces;
        EXPECT_EQ(debug.has("not enough pattern space\n"), row.result == 1) << row.pieces;
        EXPECT_EQ(evaluate(test_entry(), "(description=" + row.pieces + ")"), -1);
    }
    for (const char sign : std::string("$*+.[\\]^")) {
        filter_guard filter = filter_of("(description=*a*)");
        charray_free(std::exchange(filter->f_sub.f_sub_any, nullptr));
        std::free(std::exchange(filter->f_sub.f_sub_initial, strdup(signs(399, sign).c_str())));
        const filled_entry entry({{"description", {signs(400, sign) + "X"}}});
        for (const auto& [final, result] :
             {std::pair(std::string("X"), 0), std::pair(signs(110), -1), std::pair(signs(111), 1)}) {
            std::free(std::exchange(filter->f_sub.f_sub_final, strdup(final.c_str())));
            EXPECT_EQ(test_filter(&entry, filter.get()), result) << sign << final;
        }
    }
}

// ---- approximate match ----------------------------------------------------------------------------------------------

TEST_F(FilterEvaluation, ApproximateMatchComparesCodes)
{
    const filled_entry entry(
        {{"sn", {"Smyth", "Anne Marie Jones"}}, {"cn", {"12", "'Sm\xc3\xbcth"}}, {"ref", {"bab"}}});
    expect_results(entry, {{"(sn~=Smith)", 0},
                           {"(sn~=smits)", -1},
                           {"(sn~=Ann)", -1},
                           {"(sn~=anna maria jensen)", 0},
                           {"(cn~=34)", 0},
                           {"(cn~=smith)", 0},
                           {"(ref~=BHB)", 0},
                           {"(ref~=bb)", -1},
                           {"(sn~=)", -1}});
}

// ---- aliases of object classes --------------------------------------------------------------------------------------

class FilterEvaluationDeathTest : public model_test::Filters {
protected:
    // The environment is asked once, so each answer takes a process of its own.
    static void exit_with_answers(const char* value, bool resolved)
    {
        value == nullptr ? unsetenv("OC_ALIAS") : setenv("OC_ALIAS", value, 1);
        const filled_entry entry({{"objectClass", {"top", "employee"}}, {"cn", {"employee"}}}, true);
        const filled_entry by_alias({{"objectClass", {"worker"}}});
        // Nobody has asked yet.
        bool good = test_ava_filter(&entry, &filter_of("(objectClass=worker)")->f_ava, LDAP_FILTER_EQUALITY) == -1;
        good = good && evaluate(entry, "(cn=*)") == 0;
        setenv("OC_ALIAS", resolved ? "NO" : "YES", 1);
        const int alias = resolved ? 0 : -1;
        good =
            good && evaluate(entry, "(objectClass=worker)") == alias && evaluate(entry, "(objectClass=8.3)") == alias;
        good = good && evaluate(entry, "(2.5.4.0=Worker)") == alias && evaluate(entry, "(objectClass=employee)") == 0;
        good = good && evaluate(entry, "(objectClass=none)") == -1 && evaluate(entry, "(objectClass>=worker)") == -1;
        good = good && evaluate(entry, "(cn=worker)") == -1 && evaluate(entry, "(objectClass=work*)") == -1;
        good = good && evaluate(by_alias, "(objectClass=worker)") == (resolved ? -1 : 0);
        std::exit(good ? 0 : 1);
    }
};

TEST_F(FilterEvaluationDeathTest, AliasesOfClassesAreResolvedWhenTheEnvironmentSaysSo)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(exit_with_answers("yes", true), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(exit_with_answers("YES", true), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(exit_with_answers("no", false), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(exit_with_answers("YES ", false), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(exit_with_answers(nullptr, false), testing::ExitedWithCode(0), "");
}

// ---- threads --------------------------------------------------------------------------------------------------------

TEST_F(FilterEvaluation, ThreadsTestOneEntryAndOneFilterWithoutALock)
{
    for (const bool trees : {false, true}) {
        filled_entry entry(person, trees);
        model_test::add_passwords(entry);
        const filter_guard filter = filter_of(
            "(&(cn=miller)(cn;lang-en=m*l*r)(!(a=x))(member=cn=bob,sn=acme)(member=*,sn=*)(sn~=smith)(number>=10)"
            "(time<=20240101000000Z)(oneWay=secret)(objectClass=employee)(ref=Case*)(|(sn=x)(flag=TRUE)(cert=a)))");
        std::atomic<int> ready{0};
        std::atomic<int> wrong{0};
        std::vector<std::thread> threads;
        for (int i = 0; i < 4; ++i) {
            threads.emplace_back([&] {
                ++ready;
                while (ready < 4) {
                    std::this_thread::yield();
                }
                for (int round = 0; round < 200; ++round) {
                    wrong += test_filter(&entry, filter.get()) == 0 ? 0 : 1;
                }
            });
        }
        for (std::thread& thread : threads) {
            thread.join();
        }
        EXPECT_EQ(wrong, 0);
    }
}

}  // namespace
