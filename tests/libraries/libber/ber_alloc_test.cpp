// BER elements and controls while memory runs out.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "libraries/libber/ber_element.h"
#include "libraries/libber/ldap_control.h"
#include "libraries/libber/ldap_result.h"
#include "tests/libraries/libber/slow_ber.h"
#include "tests/support/alloc_fault.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;
using namespace slow_ber;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

namespace {

TEST(BerAlloc, AFailedWriteLeavesAnElementThatOnlyFails)
{
    const std::string filling(985, 'x'), longer(3000, 'x');  // the first leaves no room for the lengths around it
    std::string expected = text(filling);
    for (int i = 0; i < 9; ++i)
        expected = seq(expected);
    expected += text(longer);
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        BerElement* ber = ber_alloc();
        const bool done =
            ber_printf(ber, "{{{{{{{{{s}}}}}}}}}", filling.c_str()) == 0 && ber_printf(ber, "s", longer.c_str()) == 0;
        EXPECT_TRUE(done || ber_printf(ber, "n") == -1);
        berval* flat = nullptr;
        const bool flattened = ber_flatten(ber, &flat) == 0;
        EXPECT_EQ(flattened, !allocation_failed());
        const alloc_fault_pause pause;
        EXPECT_TRUE(flat == nullptr || std::string(flat->bv_val, flat->bv_len) == expected);
        ber_bvfree(flat);
        ber_free(ber, 1);
    });
    EXPECT_EQ(points, 6u);  // element, block, its growth by the closing and by the text, the copy and its bytes
}

TEST(BerAlloc, AFailedReadLeavesNothing)
{
    const std::string strings = text("x") + text("y"),
                      bytes = seq(text("a") + text("o") + text("O") + seq(strings) + set(strings));
    const berval value = {bytes.size(), const_cast<char*>(bytes.data())};
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        char *a = nullptr, **v = nullptr;
        berval o{}, *O = nullptr, **V = nullptr;
        BerElement* ber = ber_init(&value);
        const bool done = ber_scanf(ber, "{aoO{v}[V]}", &a, &o, &O, &v, &V) != LBER_ERROR;
        EXPECT_EQ(done, !allocation_failed());
        EXPECT_TRUE(ber == nullptr || ber->ber_ptr == (done ? ber->ber_end : ber->ber_buf));
        EXPECT_EQ(a != nullptr && o.bv_val != nullptr && O != nullptr && v != nullptr && V != nullptr, done);
        EXPECT_EQ(a == nullptr && o.bv_val == nullptr && O == nullptr && v == nullptr && V == nullptr, !done);
        if (done)
            std::free(a), std::free(o.bv_val), std::free(v[0]), std::free(v[1]), std::free(v);
        ber_bvfree(O);
        ber_bvecfree(done ? V : nullptr);
        ber_free(ber, 1);
    });
    EXPECT_EQ(points, 3u + 1 + 1 + 2 + 3 + 5);
}

TEST(LdapControlAlloc, AFailedCopyIsNoneAndAFailedInsertChangesNothing)
{
    char oid[] = "1.2", bytes[] = "ab";
    LDAPControl full = {oid, {2, bytes}, 1}, bare = {oid, {0, nullptr}, 0};
    LDAPControl* controls[] = {&full, &bare, nullptr};
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        LDAPControl** copy = nullptr;
        const int copied = ldap_copy_controls(controls, &copy);
        EXPECT_EQ(copied == LDAP_SUCCESS, copy != nullptr);
        LDAPControl** grown = copy;
        const int grew = ldap_insert_control(&bare, &grown);
        EXPECT_EQ(copied + grew, allocation_failed() ? LDAP_NO_MEMORY : LDAP_SUCCESS);
        if (grew == LDAP_SUCCESS)
            EXPECT_EQ(ldap_remove_control(&bare, &grown, 0), LDAP_SUCCESS);
        else
            EXPECT_EQ(grown, copy);
        ldap_controls_free(grown);
    });
    EXPECT_EQ(points, 1u + 4 + 2 + 1);
}

}  // namespace

#endif
