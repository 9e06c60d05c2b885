// The schema interface with every allocation failing in turn: null or a shorter answer, no leak, and the next try
// works.
#include <functional>
#include <memory>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/alloc_fault.h"

using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

class LdcfApiAlloc : public testing::Test {
protected:
    LdcfApiAlloc()
    {
        ldcf_api_schema_init();
        schema_test::load_small(*ldcf_schema_g);
        proposed_.copy(*ldcf_schema_g);
        ldcf_schema_proposed_g = &proposed_;
    }
    ~LdcfApiAlloc() override
    {
        ldcf_schema_proposed_g = nullptr;
        ldcf_schema_g->clear();
    }

    schema_test::relational_store store_;
    ldcf_schema proposed_;
};

}  // namespace

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that makes the records

TEST_F(LdcfApiAlloc, RecordsAreMadeWholeOrNotAtAll)
{
    const ldcf_attrtype& cn = ldcf_api_get_attrtype_from_schema_g("cn");
    const ldcf_objclass& worker = ldcf_api_get_objclass_from_schema_g("worker");
    for_each_failing_allocation([&](std::size_t) {
        asyntaxinfo* info = ldcf_rdbm::fill_asyntaxinfo(cn);
        EXPECT_EQ(info == nullptr, allocation_failed());
        ldcf_rdbm::delete_asyntaxinfo(info);
    });
    for_each_failing_allocation([&](std::size_t) {
        objectclassinfo* info = ldcf_rdbm::fill_classinfo(worker);
        EXPECT_EQ(info == nullptr, allocation_failed());
        ldcf_rdbm::delete_objectclassinfo(info);
    });
}

TEST_F(LdcfApiAlloc, LookUpsAndTheCacheDoWithoutWhatTheyCannotGet)
{
    ldcf_api_attr_get_info("cn", nullptr);  // the record itself stays
    for_each_failing_allocation([](std::size_t) {
        for (const char* name : {"cn;lang-en", "oid.commonname;x", "cn;binary", "cn"}) {
            char* base = nullptr;
            const asyntaxinfo* info = ldcf_api_attr_get_info(name, &base);
            EXPECT_TRUE(info != nullptr || allocation_failed() || std::string(name) == "cn;binary");
            std::free(base);
        }
        EXPECT_TRUE(ldcf_api_attr_get_oid("cn;binary") != nullptr || allocation_failed());
        ldcf_api_load_attr_hash();
        EXPECT_TRUE(ldcf_hash_get("cn") != nullptr || allocation_failed());
        EXPECT_NE(ldcf_api_attr_get_info("cn", nullptr), nullptr);  // by the map, if need be
        ldcf_hash_flush();
    });
}

TEST_F(LdcfApiAlloc, ListsAndDifferencesAreNullWithoutMemory)
{
    const ldcf_objclass person = ldcf_find(proposed_.object_classes, "person");
    auto changed = schema_test::parsed<ldcf_objclass>("( 8.2 NAME 'person' MUST sn MAY ( cn $ name ) )");
    person->incomplete();
    proposed_.replace(changed);
    const ldcf_objclass& active = ldcf_api_get_objclass_from_schema_g("person");
    EXPECT_GT(for_each_failing_allocation([&](std::size_t) {
                  for (auto* list : {ldcf_api_get_nonconfig_attrs, ldcf_api_get_encrypted_attrs}) {
                      char** names = list();
                      EXPECT_TRUE(names != nullptr || allocation_failed());
                      charray_free(names);
                  }
                  const std::unique_ptr<ldcf_diff_info, heap_free> info(ldcf_api_get_diff_info(active));
                  EXPECT_TRUE(info != nullptr ? info->count == 2 : allocation_failed());
                  ldcf_api_list_diff_info_delete(info != nullptr ? info->list : nullptr);
                  EXPECT_TRUE(ldcf_api_compare_SUP(active) == 0 || allocation_failed());
              }),
              20u);
}

#endif
