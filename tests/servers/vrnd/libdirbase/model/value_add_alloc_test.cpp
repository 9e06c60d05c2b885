// Attributes while memory runs out: 90, the old values and the old tree.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "servers/vrnd/libdirbase/model/value_add.h"

#include "servers/vrnd/libdirbase/model/dn_expand.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"
#include "tests/support/alloc_fault.h"

using model_test::test_entry;
using model_test::value_list;
using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

class ValueAddAlloc : public model_test::Model {};

TEST_F(ValueAddAlloc, AFailedAdditionLeavesValuesAndTreeAsTheyWere)
{
    // So many that one value more makes the array grow, and more new ones than are noted without memory.
    const value_list old({"cn=a", "cn=b", "cn=\"c,;+\""});
    std::vector<std::string> texts = {"CN=B"};
    for (char c = 'd'; c < 'p'; ++c) {
        texts.push_back(std::string("cn=") + c);
    }
    const value_list added(texts);
    for (const auto& [name, drop, mode] :
         {std::tuple("member", 1, 1), std::tuple("member", 0, 1), std::tuple("cn", 0, 0), std::tuple("twoWay", 1, 2),
          std::tuple("oneWay", 1, 1)}) {
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            auto entry = [&] {
                const alloc_fault_pause pause;
                auto made = std::make_unique<test_entry>();
                EXPECT_EQ(attr_merge(made.get(), name, old.get(), drop, mode, nullptr), 0);
                return made;
            }();
            const int result = attr_merge(entry.get(), name, added.get(), drop, mode, nullptr);
            const alloc_fault_pause pause;
            const Attribute* attr = entry->find(name);
            EXPECT_EQ(result, allocation_failed() ? 90 : 0);
            if (allocation_failed()) {
                EXPECT_EQ(attr->a_numvals, 3);
                EXPECT_EQ(attr->a_vals[3], nullptr);
                EXPECT_EQ(model_test::tree_of(attr), name == std::string("member")   ? "CN=A|CN=B|CN=C\\,\\;\\+"
                                                     : name == std::string("twoWay") ? "CN=\"C,;+\"|CN=A|CN=B"
                                                                                     : "(none)");
            }
            entry.reset();
        });
        EXPECT_GT(points, 12u) << name;
    }
}

TEST_F(ValueAddAlloc, RecordsNamesAndCopiesAreMadeWholeOrNotAtAll)
{
    const value_list values({"a", "b"});
    for_each_failing_allocation([&](std::size_t) {
        test_entry entry;
        char dn[] = "2.5.4.4=\"x,y\"+cn=z,sn=q";
        entry.e_dn = dn;
        int results = attr_merge(&entry, "2.5.4.3;lang-en", values.get(), 0, 0, nullptr);
        Attribute* fast = nullptr;
        std::int64_t room = 0;
        results += attr_merge_fast(&entry, "description", values.get(), 0, 2, &room, &fast, nullptr);
        EXPECT_TRUE(fast == nullptr || fast->a_numvals == 0 || fast->a_numvals == 2);
        results += expand_rdn(&entry);
        results += expand_rdn_esc(&entry) == 0 ? 0 : 90;  // by way of the last pair only
        EXPECT_TRUE(results == 0 || allocation_failed()) << results;
        const int order = value_cmp(values.get()[0], values.get()[1], SC_CIS, 3);
        EXPECT_EQ(order, allocation_failed() && order > 0 ? 90 : -1);
        Attribute* two_way = nullptr;
        if (flatattr_insert(&entry, model_test::info_of("twoWay"), "twoWay", &two_way, nullptr) == 0 &&
            value_add(&two_way->a_vals, values.get(), two_way) == 0) {
            EXPECT_TRUE(attr_create_decodedvals(two_way) == 0 ? two_way->a_decoded != nullptr : allocation_failed());
            const bool built = attr_decode_and_normalize_values(two_way) == 0;
            EXPECT_TRUE(built == (two_way->a_tree != nullptr) && (built || allocation_failed()));
        }
    });
}

}  // namespace

#endif
