// The checks of an entry, and the schema as an entry, with every allocation failing in turn.
#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"
#include "tests/support/alloc_fault.h"

using entry_test::text_entry;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

// A sanitizer's malloc makes what the library asks of malloc, and doesn't fail.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)

TEST(LdcfEntryCheckAlloc, ChecksSayThatTheyCouldNotBeMade)
{
    const entry_test::active_schema schema;
    const auto expect = [](const std::vector<int>& results, const std::function<int(text_entry&)>& check) {
        std::array<bool, 128> seen = {};
        for_each_failing_allocation([&](std::size_t) {
            auto entry = [&] {
                const test_support::alloc_fault_pause pause;
                return std::make_unique<text_entry>("dn: cn=x|objectClass: person|cn: x|sn: y|cert;binary: a"
                                                    "|owner: cn=a");
            }();
            const auto result = static_cast<std::size_t>(check(*entry));
            seen.at(result) = seen.at(result) || allocation_failed();
        });
        for (int result = 0; result < std::ssize(seen); ++result) {
            EXPECT_EQ(seen.at(std::size_t(result)), std::count(results.begin(), results.end(), result) == 1) << result;
        }
    };
    // A value that couldn't be added is no failure, nor is the DN of the entry without a record.
    expect({0, 1, 90}, [](text_entry& entry) { return ldcf_api_schema_check(&entry, nullptr, true); });
    expect({90}, [](text_entry& entry) { return ldcf_oc_schema_check(&entry); });
    expect({1}, [](text_entry& entry) { return oc_check_required(&entry, "person"); });
    expect({1}, [](text_entry& e) { return oc_check_allowed("cert;binary", e.e_objectclass_attr->a_vals, "cn=x"); });
    expect({1}, [](text_entry&) { return oc_attr_type_cmp("cert", "cert;binary"); });
}

TEST(LdcfEntryCheckAlloc, TheSchemaEntryIsMadeWholeOrNotAtAll)
{
    const schema_test::relational_store store;
    ldcf_schema schema;
    schema.parse_str("attributeTypes:( 1.1 NAME 'a' SYNTAX 1.3 )\nldapSyntaxes:( 1.3 )\nobjectClasses:( 1.2 ABSTRACT )",
                     "home");
    schema.complete_nocheck();
    for_each_failing_allocation([&](std::size_t) {
        Entry* entry = ldcf_api_schema2entry(&schema);
        EXPECT_EQ(entry == nullptr, allocation_failed());
        entry_free(entry);
    });
}

#endif
