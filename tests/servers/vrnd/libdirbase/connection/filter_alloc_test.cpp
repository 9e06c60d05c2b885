// Filters read and evaluated with every allocation failing in turn: whole, or a result that says so.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "tests/servers/vrnd/libdirbase/connection/filter_fixture.h"
#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/support/alloc_table.h"

using namespace model_test;
using namespace test_support;

namespace {

class FilterAlloc : public Filters {};

// The encoding of a filter without its outermost tag and length where these are to be read already.
std::string encoding_of(const char* text)
{
    return ber_of(*filter_guard(str2filter(text, 0)));
}

struct reading {
    explicit reading(const std::string& bytes)
    {
        const berval value = {bytes.size(), const_cast<char*>(bytes.data())};
        ber_init2(&value, 0, &ber);
    }
    BerElement ber = {};
};

calm_text tell_filter(Filter* filter)
{
    const calm_text told = calm([&] {
        const heap_chars text = owned(filter2str(filter));
        return tell(text.get());
    });
    filter_free(filter);
    return told;
}

calm_text tell_ava(int result, ava& assertion)
{
    const calm_text told = calm([&] {
        return tell(result, " ", assertion.ava_type, "=",
                    assertion.ava_value.bv_val == nullptr ? "(null)" : text_of(assertion.ava_value));
    });
    ava_free(&assertion, 0);
    return told;
}

constexpr char all_kinds[] =
    "(&(cn=a\\28b)(|(sn=x*y*z*)(member=cn=x,cn=y)(member=cn=a*b))(!(number>=3))(twoWay=a)(cn=*))";

TEST_F(FilterAlloc, WholeFilters)
{
    const quiet_logs quiet;
    const auto from_ber = [](const std::string& bytes) {
        return [&bytes] {
            reading at(bytes);
            Filter* filter = nullptr;
            char* text = nullptr;
            char* words = nullptr;
            const int result = get_filter(nullptr, &at.ber, &filter, &text, &words);
            EXPECT_EQ(filter == nullptr, text == nullptr);
            filter_free(filter);
            return tell(result, " ") + tell_freed(text) + " " + tell_made(words, std::free);
        };
    };
    const std::string everything = encoding_of((std::string("(|(nosuch=b)") + all_kinds + ")").c_str());
    const std::string answer =
        "0 (|(&(cn=A\\28B)(|(sn=X*Y*Z*)(member=CN=X,CN=Y)(member=CN=A*B))(!(number>=3))(twoway=A)(cn=*))) (null)";
    const std::string refused = encoding_of("(oneWay=a)");
    const std::string normal =
        "(&(cn=A(B)(|(sn=X*Y*Z*)(member=CN=X,CN=Y)(member=CN=A*B))(!(number>=3))(twoway=A)(cn=*))";
    const std::string clear =
        "(&(cn=a(b)(|(sn=x*y*z*)(member=cn=x,cn=y)(member=cn=a*b))(!(number>=3))(twoWay=a)(cn=*))";
    expect_outcomes({
        // A string that can't be copied looks like one that isn't there, and a schema record like an unknown type.
        row("get_filter", answer, {"2 (null) (null)", "90 (null) (null)", answer}, from_ber(everything)),
        row("get_filter, refused", "53 (null) made", {"53 (null) (null)", "2 (null) (null)", "90 (null) (null)"},
            from_ber(refused)),
        row("str2filter", clear, [] { return tell_filter(str2filter(all_kinds, 0)); }),
        // What can't be normalised stays as it is.
        row("str2filter, normalised", normal, {"(null)", "partly"},
            [&] {
                const calm_text told = tell_filter(str2filter(all_kinds, 1));
                const bool partly = told.str() != normal && vrn_strcasecmp(told.str().c_str(), normal.c_str()) == 0;
                return partly && allocation_failed() ? calm_text("partly") : told;
            }),
        row("filter2str", "(cn=A)",
            [] {
                const filter_guard filter = calm([] { return filter_of("(cn=a)"); });
                return tell_freed(filter2str(filter.get()));
            }),
    });
}

TEST_F(FilterAlloc, PartsFromBer)
{
    const quiet_logs quiet;
    const std::string list = encoding_of("(&(cn=a)(sn=b))");
    const std::string pieces = encoding_of("(cn=a*b*c)");
    const std::string equality = encoding_of("(cn=a)");
    expect_outcomes({
        row("get_filter_list", "0 list (cn=A)(sn=B)", {"2 - (null)", "90 - (null)"},
            [&] {
                reading at(list);
                Filter* first = nullptr;
                char* text = nullptr;
                const int result = get_filter_list(nullptr, &at.ber, &first, &text, LDAP_FILTER_AND, nullptr);
                const calm_text told = tell(result, " ", first == nullptr ? "-" : "list", " ", text);
                for (Filter* filter = first; filter != nullptr;) {
                    filter_free(std::exchange(filter, filter->f_next));
                }
                std::free(text);
                return told;
            }),
        row("get_substring_filter", "0 (cn=A*B*C)", {"2 (null)", "90 (null)"},
            [&] {
                reading at(pieces);
                auto* const filter = calm([] { return static_cast<Filter*>(std::calloc(1, sizeof(Filter))); });
                filter->f_choice = LDAP_FILTER_SUBSTRINGS;
                char* text = nullptr;
                const int result = get_substring_filter(nullptr, &at.ber, filter, &text, nullptr);
                const calm_text told = tell(result, " ", text);
                filter_free(filter);
                std::free(text);
                return told;
            }),
        row("get_ava_for_filter", "0 cn=A", {"2 (null)=(null)"},
            [&] {
                reading at(equality);
                ava assertion = {};
                const int result = get_ava_for_filter(nullptr, &at.ber, &assertion, LDAP_FILTER_EQUALITY, nullptr);
                return tell_ava(result, assertion);
            }),
        row("get_ava", "0 cn=A", {"2 (null)=(null)"},
            [&] {
                reading at(equality);
                ava assertion = {};
                const int result = get_ava(&at.ber, &assertion);
                return tell_ava(result, assertion);
            }),
        row("expand_filter_value", "0 a\\2ab", {"90 (null)"},
            [] {
                char* text = nullptr;
                const int result = expand_filter_value("a*b", 3, &text);
                return tell(result, " ") + tell_freed(text);
            }),
        row("filter_check_attr_constraints", "53 made", {"53 (null)"},
            [] {
                char* words = nullptr;
                const int result =
                    filter_check_attr_constraints(nullptr, LDAP_FILTER_EQUALITY, info_of("oneWay"), &words);
                return tell(result, " ") + tell_made(words, std::free);
            }),
    });
}

TEST_F(FilterAlloc, PartsFromText)
{
    const quiet_logs quiet;
    info_of("cn");
    expect_outcomes({
        row("str2list", "(|(cn=a)(sn=b))", [] { return tell_filter(str2list("(cn=a)(sn=b)", LDAP_FILTER_OR, 0)); }),
        row("str2simple", "(cn=a*b)", [] { return tell_filter(str2simple("cn=a*b", 0)); }),
        row("str2simple, normalised", "(cn=A)", [] { return tell_filter(str2simple("cn=a", 1)); }),
        row("str2subvals", "0", {"90"},
            [] {
                auto* const filter = calm([] { return static_cast<Filter*>(std::calloc(1, sizeof(Filter))); });
                filter->f_choice = LDAP_FILTER_SUBSTRINGS;
                const int result = str2subvals("a*b*c", filter, SC_CIS, 1);
                filter_free(filter);
                return tell(result);
            }),
        row("unescape_value", "a*b", [] { return tell_freed(unescape_value("a\\2ab")); }),
    });
}

const std::string long_text(600, 'a');
const std::string commas = "cn=\"" + std::string(300, ',') + "\"";

TEST_F(FilterAlloc, AFailedAllocationGivesAFailureOrTheAnswer)
{
    struct {
        std::string filter;
        bool trees;
        int answer;
        int failure;
        std::optional<int> other;  // what may also come of it, since the rules don't look at some failures
    } const table[] = {
        {"(description=" + long_text + ")", false, 0, 90, {}},
        {"(!(description=" + long_text + "))", false, -1, 90, {}},
        {"(description>=y)", false, -1, 90, {}},
        {"(description=*aaa*b*)", false, -1, 90, {}},
        {"(|(description=b*)(description=a*))", false, 0, 90, {}},
        {"(time>=20250101000000Z)", false, -1, 90, {}},
        {"(!(time=20250101000000Z))", false, 0, 90, {}},
        {"(number=3)", true, -1, 1, {}},
        {"(description=b)", true, -1, 1, {}},
        {"(!(member=cn=c))", true, 0, 1, {}},
        // The normal form of a DN isn't asked for its failure.
        {"(member=" + commas + ")", false, 0, 90, -1},
        {"(member=*\\,,\\,*)", false, -1, 90, {}},
        // A password counts as wrong.
        {"(oneWay=secret)", false, 0, 1, -1},
    };
    for (const auto& row : table) {
        SCOPED_TRACE(row.filter);
        filled_entry entry({{"description", {long_text}},
                            {"description;lang-de", {"x"}},
                            {"time", {"20240101000000Z"}},
                            {"number", {"1", "2"}},
                            {"member", {"cn=a", commas}}},
                           row.trees);
        add_passwords(entry);
        const filter_guard filter = filter_of(row.filter);
        const std::string entry_before = described(entry);
        const std::string filter_before = described(filter.get());
        for_each_failing_allocation([&](std::size_t) {
            const int result = test_filter(&entry, filter.get());
            const alloc_fault_pause pause;
            EXPECT_TRUE(allocation_failed() ? result == row.failure || result == row.answer || result == row.other
                                            : result == row.answer)
                << row.filter << " " << result;
            EXPECT_EQ(described(entry), entry_before);
            EXPECT_EQ(described(filter.get()), filter_before);
        });
    }
}

// What is evaluated most takes no memory, so it can't fail for it.
TEST_F(FilterAlloc, CommonValuesTakeNoMemory)
{
    const filled_entry entry({{"cn", {"Smith", std::string(511, 'x')}}, {"sn", {"a"}}, {"number", {"1"}}});
    const filter_guard filter = filter_of(
        "(&(cn=*)(cn=s*i*h)(!(cn=*y*))(cn=smith)(cn>=b)(cn~=smyth)(!(sn=b))(sn<=b)(number=1)(|(a=*)(number>=0)))");
    ASSERT_EQ(test_filter(&entry, filter.get()), 0);  // the environment has been asked
    const heap_text code(phonetic("a"));
    for_each_failing_allocation([&](std::size_t) {
        EXPECT_EQ(test_filter(&entry, filter.get()), 0);
        EXPECT_FALSE(allocation_failed());
        const heap_text other(phonetic("a"));  // there has to be one allocation
        EXPECT_EQ(other == nullptr, allocation_failed());
    });
}

TEST_F(FilterAlloc, PartsOfEvaluation)
{
    const filled_entry entry({{"description", {long_text}}, {"description;lang-de", {"x"}}});
    const filter_guard both = filter_of("(&(description=" + long_text + ")(description=*aaa*))");
    const Filter* const equality = both->f_list;
    const Filter* const pieces = equality->f_next;
    const filter_guard tagged = filter_of("(description;lang-de~=x)");
    const std::string before = described(entry);
    const auto same = [&](int result) {
        return calm([&] { return tell(result, described(entry) == before ? "" : " changed"); });
    };
    expect_outcomes({
        row("test_filter_list", "0", {"90"},
            [&] { return same(test_filter_list(&entry, both->f_list, LDAP_FILTER_AND)); }),
        row("test_ava_filter", "0", {"90"},
            [&] { return same(test_ava_filter(&entry, &equality->f_ava, LDAP_FILTER_EQUALITY)); }),
        row("test_substring_filter", "0", {"90"}, [&] { return same(test_substring_filter(&entry, pieces)); }),
        row("filter_print", "(description;lang-de~=X)\n", {"(no filter)\n"},
            [&] {
                calm(testing::internal::CaptureStdout);
                filter_print(tagged.get());
                return calm([] { return calm_text(testing::internal::GetCapturedStdout()); });
            }),
        row("phonetic", "A226", [] { return tell_freed(phonetic("Ashcraft")); }),
        row("word_dup", "ab", [] { return tell_freed(word_dup("ab c")); }),
    });
}

}  // namespace

#endif
