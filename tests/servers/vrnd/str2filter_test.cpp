// Filters from text, and back.
#include "servers/vrnd/str2filter.h"

#include <random>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using namespace model_test;

namespace {

using Str2Filter = Model;

std::string printed(const Filter* filter)
{
    const std::unique_ptr<char, decltype(&std::free)> text(filter2str(filter), std::free);
    return text == nullptr ? "(none)" : text.get();
}

TEST_F(Str2Filter, ReadsTheTextFormAsItIsWrittenOrNormalised)
{
    constexpr char none[] = "(none)";
    const struct {
        const char* text;
        const char* raw;
        const char* normal;
    } cases[] = {
        {"", none, none},
        {"cn=a", "(cn=a)", "(cn=A)"},
        {"(CN=a)", "(CN=a)", "(cn=A)"},
        {"(cn=a)behind", "(cn=a)", "(cn=A)"},
        {"(cn=a", none, none},
        {"cn", none, none},
        {"()", none, none},
        {"(", none, none},
        {")", none, none},
        {"(cn)", none, none},
        {"(=a)", "(=a)", none},
        {"(cn>=a*b)", "(cn>=a*b)", "(cn>=A*B)"},
        {"(cn<=a)", "(cn<=a)", "(cn<=A)"},
        {"(cn~=a=b)", "(cn~=a=b)", "(cn~=A=B)"},
        {"(>=a)", "(>=a)", none},
        {"( CN = a)", "( CN = a)", "(cn= A)"},
        {"(CN=*)", "(cn=*)", "(cn=*)"},
        {"(nosuch=*)", "(nosuch=*)", "(nosuch=*)"},
        {"(nosuch=a)", "(nosuch=a)", none},
        {"(NoSuch=a*)", "(NoSuch=a*)", "(nosuch=a*)"},
        {"(cn=a*b*c)", "(cn=a*b*c)", "(cn=A*B*C)"},
        {"(cn=**)", "(cn=**)", "(cn=**)"},
        {"(cn=*a)", "(cn=*a)", "(cn=*A)"},
        {"(cn=\\2a)", "(cn=*)", "(cn=*)"},
        {"(cn=a\\28b)", "(cn=a(b)", "(cn=A(B)"},
        {"(cn=a\\2a*)", "(cn=a\\2a*)", "(cn=A\\2A*)"},
        {"(cn=\\)", none, none},
        {"(cn=\\))", "(cn=\\))", "(cn=\\))"},
        {"(member=cn = a)", "(member=cn = a)", "(member=CN=A)"},
        {"(member=cn=a*)", "(member=cn=a*)", "(member=CN=A*)"},
        {"(member=part*of, a dn)", "(member=part*of, a dn)", "(member=PART*OF, A DN)"},
        {"(member=no dn)", "(member=no dn)", "(member=no dn)"},
        {"(&)", "(&)", "(&)"},
        {"(!)", "(!)", "(!)"},
        {"(&(cn=a) \t\n(sn=b))", "(&(cn=a)(sn=b))", "(&(cn=A)(sn=B))"},
        {"(!(cn=a)(sn=b))", "(!(cn=a)(sn=b))", "(!(cn=A)(sn=B))"},
        {"(|(&(cn=a)(!(sn=b)))(c=d*))", "(|(&(cn=a)(!(sn=b)))(c=d*))", "(|(&(cn=A)(!(sn=B)))(c=d*))"},
        {"(&(cn=a)x)", none, none},
        {"(&cn=a)", none, none},
        {"(&(cn=a)(sn))", none, none},
        {"(&(cn=a)(sn=b)", none, none},
        {"(&(cn=a))(sn=b)", "(&(cn=a))", "(&(cn=A))"},
        {"(|(cn=a)(nosuch=b))", "(|(cn=a)(nosuch=b))", none},
    };
    for (const auto& test : cases) {
        EXPECT_EQ(printed(filter_guard(str2filter(test.text, 0)).get()), test.raw) << test.text;
        EXPECT_EQ(printed(filter_guard(str2filter(test.text, 1)).get()), test.normal) << test.text;
    }
    EXPECT_EQ(str2filter(nullptr, 1), nullptr);
    EXPECT_EQ(printed(filter_guard(str2list(" (cn=a)(sn=b)", LDAP_FILTER_OR, 0)).get()), "(|(cn=a)(sn=b))");
    EXPECT_EQ(str2list("(cn=a)", LDAP_FILTER_PRESENT, 0), nullptr);
}

TEST_F(Str2Filter, KeepsTheBytesOfAValue)
{
    const filter_guard item(str2simple("cert=\\00\\fF\\7\\g\\4\\\\41\\", 1));
    ASSERT_NE(item, nullptr);
    EXPECT_EQ(text_of(item->f_ava.ava_value), std::string("\0\xff\7\\g\4\\A\\", 9));
    Filter pieces = {};
    pieces.f_choice = LDAP_FILTER_SUBSTRINGS;
    EXPECT_EQ(str2subvals("us*x*", &pieces, SC_CIS | SC_COUNTRY_STRING, 1), LDAP_SUCCESS);
    EXPECT_STREQ(pieces.f_sub.f_sub_initial, "US");
    EXPECT_STREQ(pieces.f_sub.f_sub_any[0], "x");  // refused by the syntax, and kept
    EXPECT_EQ(pieces.f_sub.f_sub_final, nullptr);
    free(pieces.f_sub.f_sub_initial);
    charray_free(pieces.f_sub.f_sub_any);
}

TEST(FindMatchingParen, CountsWhatIsNotHidden)
{
    const struct {
        const char* text;
        int place;
    } cases[] = {{"(a)", 2}, {"(a(b)c)d)", 6}, {"(a\\)b)", 5}, {"(a\\\\)b)", 4}, {"(a", -1},
                 {"", -1},   {"a(b)", 0},      {"\\(a)", 0},   {")", -1},        {")(a)", 1}};
    for (const auto& test : cases) {
        const char* const found = find_matching_paren(test.text);
        EXPECT_EQ(found == nullptr ? -1 : found - test.text, test.place) << test.text;
    }
}

TEST(Str2FilterDepth, IsBounded)
{
    for (const unsigned levels : {FILTER_MAX_DEPTH, FILTER_MAX_DEPTH + 1, 100000u}) {
        std::string text = "(cn=a)";
        for (unsigned i = 1; i < levels && levels < 1000; ++i) {
            text = "(!" + text + ")";
        }
        if (levels >= 1000) {
            text.clear();
            for (unsigned i = 0; i < levels; ++i) {
                text += "(!";
            }
            text += "(cn=a)" + std::string(levels, ')');
        }
        const filter_guard filter(str2filter(text.c_str(), 0));
        EXPECT_EQ(filter != nullptr, levels == FILTER_MAX_DEPTH);
        if (filter != nullptr) {
            EXPECT_EQ(printed(filter.get()), text);
        }
    }
}

// ---- any tree -------------------------------------------------------------------------------------------------------

bool same(const Filter* a, const Filter* b)
{
    const auto equal = [](const char* x, const char* y) {
        return x == nullptr || y == nullptr ? x == y : std::strcmp(x, y) == 0;
    };
    if (a == nullptr || b == nullptr || a->f_choice != b->f_choice) {
        return a == b;
    }
    if (filter_has_list(a->f_choice)) {
        const Filter* x = a->f_list;
        const Filter* y = b->f_list;
        for (; x != nullptr && same(x, y); x = x->f_next) {
            y = y->f_next;
        }
        return x == nullptr && y == nullptr;
    }
    if (filter_has_ava(a->f_choice)) {
        return equal(a->f_ava.ava_type, b->f_ava.ava_type) &&
               text_of(a->f_ava.ava_value) == text_of(b->f_ava.ava_value);
    }
    if (a->f_choice == LDAP_FILTER_PRESENT) {
        return equal(a->f_type, b->f_type);
    }
    char* none[] = {nullptr};
    char** x = a->f_sub.f_sub_any == nullptr ? none : a->f_sub.f_sub_any;
    char** y = b->f_sub.f_sub_any == nullptr ? none : b->f_sub.f_sub_any;
    for (; *x != nullptr && equal(*x, *y); ++x) {
        ++y;
    }
    return *x == *y && equal(a->f_sub.f_sub_type, b->f_sub.f_sub_type) &&
           equal(a->f_sub.f_sub_initial, b->f_sub.f_sub_initial) && equal(a->f_sub.f_sub_final, b->f_sub.f_sub_final);
}

class any_filter {
public:
    explicit any_filter(unsigned seed) : random_(seed) {}

    filter_guard make(int depth)
    {
        constexpr std::uint64_t choices[] = {LDAP_FILTER_AND,        LDAP_FILTER_OR,     LDAP_FILTER_NOT,
                                             LDAP_FILTER_EQUALITY,   LDAP_FILTER_GE,     LDAP_FILTER_LE,
                                             LDAP_FILTER_SUBSTRINGS, LDAP_FILTER_APPROX, LDAP_FILTER_PRESENT};
        filter_guard filter(static_cast<Filter*>(std::calloc(1, sizeof(Filter))));
        filter->f_choice = choices[depth == 0 ? 3 + below(6) : below(9)];
        if (filter_has_list(filter->f_choice)) {
            Filter** end = &filter->f_list;
            for (std::size_t count = below(4); count > 0; --count) {
                *end = make(depth - 1).release();
                end = &(*end)->f_next;
            }
        } else if (filter_has_ava(filter->f_choice)) {
            filter->f_ava.ava_type = name();
            filter->f_ava.ava_value.bv_val = text(0);
            filter->f_ava.ava_value.bv_len = std::strlen(filter->f_ava.ava_value.bv_val);
        } else if (filter->f_choice == LDAP_FILTER_PRESENT) {
            filter->f_type = name();
        } else {
            filter->f_sub.f_sub_type = name();
            filter->f_sub.f_sub_initial = text(0);
            for (std::size_t count = below(3); count > 0; --count) {
                charray_add(&filter->f_sub.f_sub_any, text(0));
            }
            // With an empty initial piece alone the text would say presence.
            const bool bare = *filter->f_sub.f_sub_initial == '\0' && filter->f_sub.f_sub_any == nullptr;
            filter->f_sub.f_sub_final = bare || below(2) == 0 ? text(1) : nullptr;
        }
        return filter;
    }

private:
    std::size_t below(std::size_t limit) { return random_() % limit; }
    char* name() { return ::strdup(below(2) == 0 ? "cn" : "x-y;lang-de"); }
    char* text(std::size_t least)
    {
        constexpr char letters[] = "aB =<>~&|!,\xc3\x28x";
        std::string made;
        for (std::size_t count = least + below(5); count > 0; --count) {
            const char letter = letters[below(sizeof letters - 1)];
            made += letter == '(' ? 'z' : letter;
        }
        return ::strdup(made.c_str());
    }

    std::mt19937 random_;
};

TEST(FilterText, IsReadAsTheTreeThatItWasWrittenFrom)
{
    for (unsigned seed = 0; seed < 2000; ++seed) {
        const filter_guard filter = any_filter(seed).make(4);
        const std::string text = printed(filter.get());
        const filter_guard again(str2filter(text.c_str(), 0));
        ASSERT_TRUE(same(filter.get(), again.get())) << text << "\n" << printed(again.get());
    }
}

TEST(FilterText, IsNoneForATreeThatIsNone)
{
    Filter unknown = {};
    unknown.f_choice = LDAP_FILTER_EXTENDED;
    Filter parent = {};
    parent.f_choice = LDAP_FILTER_AND;
    parent.f_list = &unknown;
    EXPECT_EQ(printed(&parent), "(none)");
    EXPECT_EQ(printed(nullptr), "(none)");
    testing::internal::CaptureStdout();
    filter_print(&parent);
    filter_print(filter_guard(str2filter("(cn=a)", 0)).get());
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "(no filter)\n(cn=a)\n");
    filter_free(nullptr);
    ava_free(nullptr, 1);
}

}  // namespace
