// Evaluation of filters while memory runs out: a failure or the answer, and entry and filter stay as they were.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include <optional>

#include "libraries/libmsg/message_log.h"
#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/support/alloc_fault.h"

using model_test::filled_entry;
using model_test::filter_of;
using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

class FilterEvaluationAlloc : public model_test::Filters {};

const std::string long_text(600, 'a');
const std::string commas = "cn=\"" + std::string(300, ',') + "\"";

TEST_F(FilterEvaluationAlloc, AFailedAllocationGivesAFailureOrTheAnswer)
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
        model_test::add_passwords(entry);
        const filter_guard filter = filter_of(row.filter);
        const std::string entry_before = model_test::described(entry);
        const std::string filter_before = model_test::described(filter.get());
        for_each_failing_allocation([&](std::size_t) {
            const int result = test_filter(&entry, filter.get());
            const alloc_fault_pause pause;
            EXPECT_TRUE(allocation_failed() ? result == row.failure || result == row.answer || result == row.other
                                            : result == row.answer)
                << row.filter << " " << result;
            EXPECT_EQ(model_test::described(entry), entry_before);
            EXPECT_EQ(model_test::described(filter.get()), filter_before);
        });
    }
}

// What is evaluated most takes no memory, so it can't fail for it.
TEST_F(FilterEvaluationAlloc, CommonValuesTakeNoMemory)
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

TEST_F(FilterEvaluationAlloc, CopiesOfWordsAreNullWithoutMemory)
{
    for_each_failing_allocation([](std::size_t) {
        const heap_text code(phonetic("Ashcraft"));
        const heap_text word(word_dup("ab c"));
        EXPECT_EQ(code == nullptr || word == nullptr, allocation_failed());
    });
}

}  // namespace

#endif
