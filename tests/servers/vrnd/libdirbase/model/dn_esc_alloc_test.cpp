// DNs while memory runs out, and how much memory they take.
#include <gtest/gtest.h>

#include <cstdlib>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"
#include "tests/support/alloc_fault.h"

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

class DnAlloc : public model_test::with_active_schema {};

TEST_F(DnAlloc, NormalizingTakesABlockAPairAndAnRdnAndAFewMore)
{
    const struct {
        const char* dn;
        std::size_t pairs, rdns;
    } cases[] = {
        {"cn=a,ou=b,o=c", 3, 3},
        {"sn=\"b;\"+cn=a, ou=\\#b, 2.5.4.10=c, dc=d, c=de", 6, 5},
        {"memberUid=A,1.1=b,1.1=c+1.1=d+1.1=e", 5, 3},  // in names much longer than the text
    };
    for (const auto& c : cases) {
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            ldap_escDN* dn = dn_normalize_esc(c.dn);
            EXPECT_EQ(dn == nullptr ? LDAP_NO_MEMORY : dn->result, allocation_failed() ? LDAP_NO_MEMORY : LDAP_SUCCESS);
            if (dn != nullptr && allocation_failed()) {
                EXPECT_EQ(dn->internal_error, DN_ERR_NO_MEMORY);
                EXPECT_TRUE(dn->canonical == nullptr || *dn->canonical == '\0');
            }
            free_ldap_escDN(&dn);
            EXPECT_EQ(dn, nullptr);
        });
        EXPECT_LE(points, 4 + c.pairs + c.rdns) << c.dn;
    }
}

TEST_F(DnAlloc, WhatIsMadeOfARecordIsNullOrUnchangedWithoutMemory)
{
    ldap_escDN* dn = dn_normalize_esc("cn=a,sn=\\\"b\\\"+cn=c,memberUid=d");
    ldap_escDN* other = dn_normalize_esc("cn=a,sn=\\\"b\\\"+cn=c,memberUid=e");
    for_each_failing_allocation([&](std::size_t) {
        ldap_escDN* parent = ParentDN33(dn);
        EXPECT_EQ(parent == nullptr, allocation_failed());
        free_ldap_escDN(&parent);
    });
    for_each_failing_allocation([&](std::size_t) {
        char* text = getParentDn(dn);
        char* upper = getParentDnUpper(dn);
        EXPECT_EQ(text == nullptr || upper == nullptr, allocation_failed());
        std::free(text);
        std::free(upper);
    });
    for_each_failing_allocation([&](std::size_t) { EXPECT_EQ(compare_ldap_escDN(dn, other), 0); });
    EXPECT_EQ(ldcf_api_get_modify_attr_info_lock_g()->count, 0);
    free_ldap_escDN(&dn);
    free_ldap_escDN(&other);

    for_each_failing_allocation([&](std::size_t) {
        char text[] = "cn=a";
        char* replaced = text;
        const int rc = replace_DN(&replaced, 0);
        EXPECT_EQ(rc, allocation_failed() ? LDAP_NO_MEMORY : LDAP_SUCCESS);
        EXPECT_EQ(replaced == text, allocation_failed());
        if (replaced != text) {
            std::free(replaced);
        }
    });
    for_each_failing_allocation([&](std::size_t) {
        char text[] = "sn=b+cn=a,o=x";
        dn_normalize(text);
        EXPECT_STREQ(text, allocation_failed() ? "sn=b+cn=a,o=x" : "cn=a+sn=b,o=x");
    });
    char suffix[] = "O=X";
    char* suffixes[] = {suffix, nullptr};
    Backend be{.be_suffix = suffixes, .be_type = "rdbm"};
    for_each_failing_allocation([&](std::size_t) {
        char* parent = nullptr;
        const int rc = dn_get_parent(&be, "cn=a,o=x", &parent);
        EXPECT_EQ(rc, allocation_failed() ? LDAP_NO_MEMORY : LDAP_SUCCESS);
        EXPECT_EQ(parent == nullptr, allocation_failed());
        std::free(parent);
    });
}

}  // namespace

#endif
