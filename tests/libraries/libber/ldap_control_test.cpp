// Controls in arrays, and result codes in words.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <set>
#include <string>

#include "libraries/libber/ldap_control.h"
#include "libraries/libber/ldap_error.h"
#include "libraries/libber/ldap_result.h"

namespace {

// A control with the text, and with the value unless that is null.
LDAPControl* make(const char* oid, const char* value, int critical = 0)
{
    auto* control = static_cast<LDAPControl*>(std::calloc(1, sizeof(LDAPControl)));
    control->ldctl_oid = strdup(oid);
    if (value != nullptr) {
        control->ldctl_value = {std::strlen(value), strdup(value)};
    }
    control->ldctl_iscritical = critical;
    return control;
}

std::string shown(LDAPControl* const* controls)
{
    std::string all;
    for (; controls != nullptr && *controls != nullptr; ++controls) {
        const berval& value = (*controls)->ldctl_value;
        all += (*controls)->ldctl_oid + ((*controls)->ldctl_iscritical != 0 ? std::string("!") : "");
        all += value.bv_val == nullptr ? ";" : "=" + std::string(value.bv_val, value.bv_len) + ";";
    }
    return all;
}

TEST(LdapControl, ArraysGrowShrinkAndAreCopiedWhole)
{
    LDAPControl** controls = nullptr;
    LDAPControl* of[] = {make("1.1", "abc"), make("1.2", nullptr, 1), make("1.3", "")};
    for (LDAPControl* control : of) {
        EXPECT_EQ(ldap_insert_control(control, &controls), LDAP_SUCCESS);
    }
    EXPECT_EQ(shown(controls), "1.1=abc;1.2!;1.3=;");

    LDAPControl** copy = nullptr;
    ASSERT_EQ(ldap_copy_controls(controls, &copy), LDAP_SUCCESS);
    EXPECT_EQ(ldap_remove_control(copy[0], &controls, 1), LDAP_PARAM_ERROR);  // its like is there, itself isn't
    EXPECT_EQ(ldap_remove_control(of[1], &controls, 1), LDAP_SUCCESS);
    EXPECT_EQ(shown(controls), "1.1=abc;1.3=;");
    EXPECT_EQ(ldap_remove_control(of[2], &controls, 0), LDAP_SUCCESS);
    EXPECT_EQ(ldap_remove_control(of[2], &controls, 0), LDAP_PARAM_ERROR);
    EXPECT_EQ(ldap_remove_control(of[0], &controls, 1), LDAP_SUCCESS);
    EXPECT_EQ(controls, nullptr);
    ldap_control_free(of[2]);

    EXPECT_EQ(shown(copy), "1.1=abc;1.2!;1.3=;");
    EXPECT_EQ(copy[0]->ldctl_value.bv_val[3], '\0');
    ldap_controls_free(copy);
}

TEST(LdapControl, WhatIsMissingIsToldOrDoesNothing)
{
    LDAPControl** controls = nullptr;
    LDAPControl record = {};
    EXPECT_EQ(ldap_insert_control(nullptr, &controls), LDAP_PARAM_ERROR);
    EXPECT_EQ(ldap_insert_control(&record, nullptr), LDAP_PARAM_ERROR);
    EXPECT_EQ(ldap_remove_control(&record, &controls, 1), LDAP_PARAM_ERROR);
    EXPECT_EQ(ldap_copy_controls(controls, nullptr), LDAP_PARAM_ERROR);
    LDAPControl* none = nullptr;
    controls = &none;
    EXPECT_EQ(ldap_copy_controls(nullptr, &controls), LDAP_SUCCESS);
    EXPECT_EQ(controls, nullptr);
    ASSERT_EQ(ldap_copy_controls(&none, &controls), LDAP_SUCCESS);
    EXPECT_EQ(controls[0], nullptr);
    ldap_controls_free(controls);
    LDAPControl* bare = ldap_copy_control(&record);
    EXPECT_TRUE(bare->ldctl_oid == nullptr && bare->ldctl_value.bv_val == nullptr);
    ldap_control_free(bare);
    EXPECT_EQ(ldap_copy_control(nullptr), nullptr);
}

TEST(LdapErr2String, EachCodeHasATextOfItsOwnAndOthersShareOne)
{
    std::set<std::string> texts;
    for (int code = -300; code <= 300; ++code) {
        texts.insert(ldap_err2string(code));
    }
    EXPECT_EQ(texts.size(), 52u + 1);  // the enumerators of ldap_result, and the others
    EXPECT_STREQ(ldap_err2string(LDAP_SUCCESS), "Success");
    EXPECT_STREQ(ldap_err2string(-1), ldap_err2string(9));
}

}  // namespace
