// Filters while memory runs out: whole, or a result that says so, and nothing is left behind.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/message_log.h"
#include "tests/servers/vrnd/libdirbase/connection/filter_fixture.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/message_catcher.h"

using namespace model_test;
using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

using FilterAlloc = Model;

TEST_F(FilterAlloc, AFilterFromBerIsWholeOrRefused)
{
    const filter_guard raw(str2filter("(&(cn=a\\28b)(|(sn=x*y*z*)(nosuch=b)(member=cn=x,cn=y)(member=cn=a*b))"
                                      "(!(number>=3))(twoWay=a)(cn=*))",
                                      0));
    const std::string bytes = test_support::ber_of(*raw);
    std::string whole;
    test_support::message_catcher messages;
    message_no_memory();  // the first line of the log makes what the C library keeps for the time zone
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        BerElement ber;
        const berval value = {bytes.size(), const_cast<char*>(bytes.data())};
        ber_init2(&value, 0, &ber);
        Filter* filter = nullptr;
        char* text = nullptr;
        const int result = get_filter(nullptr, &ber, &filter, &text, nullptr);
        const alloc_fault_pause pause;
        messages.clear();
        whole = point == 0 ? text : whole;
        // A string that can't be copied looks like one that isn't there, and a schema record like an unknown type.
        EXPECT_TRUE(result == 0 || result == LDAP_NO_MEMORY || result == LDAP_PROTOCOL_ERROR) << result;
        if (result == 0 && filter != nullptr) {
            EXPECT_EQ(text, whole) << point;
        } else {
            EXPECT_TRUE(allocation_failed());
            EXPECT_EQ(filter, nullptr);
            EXPECT_EQ(text, nullptr);
        }
        filter_free(filter);
        std::free(text);
    });
    EXPECT_GT(points, 40u);
}

TEST_F(FilterAlloc, AFilterFromTextIsWholeOrNone)
{
    for (const int normalize : {0, 1}) {
        const std::string text = "(&(cn=a\\28b)(|(sn=x*y*z*)(member=cn=x,cn=y)(member=cn=a*b))(!(number>=3))(cn=*))";
        std::string whole;
        const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
            Filter* const filter = str2filter(text.c_str(), normalize);
            char* const printed = filter2str(filter);
            const alloc_fault_pause pause;
            whole = point == 0 ? printed : whole;
            EXPECT_TRUE(printed != nullptr || allocation_failed());
            if (printed != nullptr && printed != whole) {  // what can't be normalised stays as it is
                EXPECT_TRUE(normalize == 1 && allocation_failed()) << printed;
            }
            filter_free(filter);
            std::free(printed);
        });
        EXPECT_GT(points, 20u);
    }
}

TEST_F(FilterAlloc, RefusalsAreTheSameWithoutTheirWords)
{
    test_support::message_catcher messages;
    message_no_memory();
    const std::string one_way = test_support::ber_of(*filter_guard(str2filter("(oneWay=a)", 0)));
    int without_words = 0;
    for_each_failing_allocation([&](std::size_t) {
        BerElement ber;
        const berval value = {one_way.size(), const_cast<char*>(one_way.data())};
        ber_init2(&value, 0, &ber);
        Filter* filter = nullptr;
        char* text = nullptr;
        char* words = nullptr;
        const int result = get_filter(nullptr, &ber, &filter, &text, &words);
        const alloc_fault_pause pause;
        messages.clear();
        if (result == LDAP_UNWILLING_TO_PERFORM) {
            without_words += words == nullptr ? 1 : 0;
        } else {
            EXPECT_TRUE(allocation_failed() && words == nullptr) << result;
        }
        EXPECT_EQ(filter, nullptr);
        std::free(words);
    });
    EXPECT_EQ(without_words, 1);
}

}  // namespace

#endif
