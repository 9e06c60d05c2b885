// The parts of the two readers of filters, each called by itself, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "tests/servers/vrnd/libdirbase/connection/filter_fixture.h"
#include "tests/support/alloc_table.h"

using namespace model_test;
using namespace test_support;

namespace {

using FilterCallsAlloc = Model;

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

TEST_F(FilterCallsAlloc, PartsFromBer)
{
    const quiet_logs quiet;
    const std::string list = encoding_of("(&(cn=a)(sn=b))");
    const std::string pieces = encoding_of("(cn=a*b*c)");
    const std::string equality = encoding_of("(cn=a)");
    expect_outcomes({
        {"get_filter_list",
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
         },
         "0 list (cn=A)(sn=B)",
         {"2 - (null)", "90 - (null)"}},
        {"get_substring_filter",
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
         },
         "0 (cn=A*B*C)",
         {"2 (null)", "90 (null)"}},
        {"get_ava_for_filter",
         [&] {
             reading at(equality);
             ava assertion = {};
             const int result = get_ava_for_filter(nullptr, &at.ber, &assertion, LDAP_FILTER_EQUALITY, nullptr);
             return tell_ava(result, assertion);
         },
         "0 cn=A",
         {"2 (null)=(null)"}},
        {"get_ava",
         [&] {
             reading at(equality);
             ava assertion = {};
             const int result = get_ava(&at.ber, &assertion);
             return tell_ava(result, assertion);
         },
         "0 cn=A",
         {"2 (null)=(null)"}},
        {"expand_filter_value",
         [] {
             char* text = nullptr;
             const int result = expand_filter_value("a*b", 3, &text);
             return tell(result, " ") + tell_freed(text);
         },
         "0 a\\2ab",
         {"90 (null)"}},
        {"filter_check_attr_constraints",
         [] {
             char* words = nullptr;
             const int result = filter_check_attr_constraints(nullptr, LDAP_FILTER_EQUALITY, info_of("oneWay"), &words);
             return tell(result, " ") + tell_made(words, std::free);
         },
         "53 made",
         {"53 (null)"}},
    });
}

TEST_F(FilterCallsAlloc, PartsFromText)
{
    const quiet_logs quiet;
    info_of("cn");
    expect_outcomes({
        {"str2list",
         [] { return tell_filter(str2list("(cn=a)(sn=b)", LDAP_FILTER_OR, 0)); },
         "(|(cn=a)(sn=b))",
         {"(null)"}},
        {"str2simple", [] { return tell_filter(str2simple("cn=a*b", 0)); }, "(cn=a*b)", {"(null)"}},
        {"str2simple, normalised", [] { return tell_filter(str2simple("cn=a", 1)); }, "(cn=A)", {"(null)"}},
        {"str2subvals",
         [] {
             auto* const filter = calm([] { return static_cast<Filter*>(std::calloc(1, sizeof(Filter))); });
             filter->f_choice = LDAP_FILTER_SUBSTRINGS;
             const int result = str2subvals("a*b*c", filter, SC_CIS, 1);
             filter_free(filter);
             return tell(result);
         },
         "0",
         {"90"}},
        {"unescape_value", [] { return tell_freed(unescape_value("a\\2ab")); }, "a*b", {"(null)"}},
    });
}

}  // namespace

#endif
