// The calls that DNs are taken apart and put together with, each by itself, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/be_suffix.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"
#include "tests/support/alloc_table.h"

using namespace test_support;
using model_test::info_of;

namespace {

class DnCallsAlloc : public model_test::Model {
protected:
    DnCallsAlloc()
    {
        for (const char* name : {"cn", "sn", "a", "member"}) {
            info_of(name);
        }
    }
};

// Result, error and texts of a record, which is released.
calm_text tell_dn(ldap_escDN* dn)
{
    if (dn == nullptr) {
        return "(null)";
    }
    const calm_text told = tell(dn->result, " ", dn->internal_error, " ", GetDNString33(dn), " ", GetDNUpper33(dn));
    free_ldap_escDN(&dn);
    return told;
}

// Changes a copy of a text in place and tells it.
calm_text tell_changed(char* (*change)(char*), const char* text)
{
    char* const copy = heap_copy(text);
    change(copy);
    return tell_freed(copy);
}

constexpr char two_pairs[] = "sn=b+cn=a,a=x";

TEST_F(DnCallsAlloc, RecordsAreMadeWholeOrSayWhatIsMissing)
{
    const std::vector<std::string> none = {"(null)"};
    const std::vector<std::string> none_or_marked = {"(null)", "90 90  ", "90 90 (null) (null)"};
    const quiet_logs quiet;
    ldap_escDN* const parsed = calm([] { return dn_normalize_esc(two_pairs); });
    expect_outcomes({
        {"dn_normalize_light_esc", [] { return tell_dn(dn_normalize_light_esc("sn=b+cn=a")); },
         "0 0 cn=a+sn=b CN=A+SN=B", none_or_marked},
        {"parse_escDN",
         [] { return tell_dn(parse_escDN("sn=b+cn=a", dn_order_given, 0)); },
         "0 0 sn=b+cn=a SN=B+CN=A",
         {"(null)", "0 90  ", "0 90 (null) (null)"}},
        {"parse_escRDN",
         [] {
             ldap_escDN* dn = calm([] { return new_ldap_escDN(100); });
             ldapDN_elem33* const rdn = calm(new_ldapDN_elem33);
             ldap_escDN_work work = {&dn, 0, 100};
             int error = -1;
             parse_escRDN("sn=b+cn=a", rdn, &work, dn_order_given, 0, &error);
             const calm_text told = tell(error, " ", rdn->count);
             free_ldapDN_elem33(rdn);
             free_ldap_escDN(&dn);
             return told;
         },
         "0 2",
         {"90 0", "90 1"}},
        {"normAttrValue",
         [] {
             int error = 0;
             const calm_text text = tell_freed(normAttrValue("\"a,b\"", &error));
             return tell(text, " ", error);
         },
         "a,b 0",
         {"(null) 90"}},
        {"BuildDNString33",
         [] {
             ldap_escDN* const dn = calm([] { return dn_normalize_esc(two_pairs); });
             const bool built = BuildDNString33(dn) != nullptr;
             return tell(built, " ") + tell_dn(dn);
         },
         "1 0 0 cn=a+sn=b,a=x CN=A+SN=B,A=X",
         {"0 0 90 (null) (null)"}},
        {"dn_upcase_esc",
         [] {
             ldap_escDN* const dn = calm([] { return dn_normalize_esc("a=x"); });
             const bool built = dn_upcase_esc(dn) != nullptr;
             return tell(built, " ") + tell_dn(dn);
         },
         "1 0 0 a=x A=X",
         {"0 0 90 a=x A=X"}},
        {"copy_ldapDN_elem33", [&] { return tell_made(copy_ldapDN_elem33(parsed->rdns), free_ldapDN_elem33); }, "made",
         none},
        {"new_ldap_escDN", [] { return tell_made(new_ldap_escDN(9), [](ldap_escDN* dn) { free_ldap_escDN(&dn); }); },
         "made", none},
        {"new_ldapDN_elem33", [] { return tell_made(new_ldapDN_elem33(), free_ldapDN_elem33); }, "made", none},
        {"new_ldapRDN_elem33", [] { return tell_made(new_ldapRDN_elem33("cn", "a", SC_CIS), free_ldapRDN_elem33); },
         "made", none},
        {"replace_DN",
         [] {
             char* text = heap_copy("a=x");
             const int result = replace_DN(&text, 1);
             return tell(result, " ") + tell_freed(text);
         },
         "0 A=X",
         {"90 a=x"}},
    });
    // Values that can't be resolved for want of memory are compared as they are.
    ldap_escDN* quoted = dn_normalize_esc("sn=\\\"b\\\"");
    ldap_escDN* plain = dn_normalize_esc("sn=b");
    expect_outcomes({
        {"compare_ldapDN_elem33",
         [&] { return tell(compare_ldapDN_elem33(quoted->rdns, plain->rdns)); },
         "1",
         {"0", "1"}},
        {"compare_ldapRDN33",
         [&] { return tell(compare_ldapRDN33(quoted->rdns->pairs->rdn, plain->rdns->pairs->rdn)); },
         "1",
         {"0", "1"}},
        {"compare_ldap_escDN", [&] { return tell(compare_ldap_escDN(quoted, plain)); }, "1", {"0", "1"}},
    });
    for (ldap_escDN* dn : {parsed, quoted, plain}) {
        free_ldap_escDN(&dn);
    }
}

TEST_F(DnCallsAlloc, TextsStayAsTheyWere)
{
    expect_outcomes({
        {"dn_normalize_compound_RDN",
         [] { return tell_changed(dn_normalize_compound_RDN, two_pairs); },
         "cn=a+sn=b,a=x",
         {two_pairs}},
        {"dn_normalize_case",
         [] { return tell_changed(dn_normalize_case, two_pairs); },
         "CN=A+SN=B,A=X",
         {"SN=B+CN=A,A=X"}},
        {"dn_compare", [] { return tell(dn_compare("CN=A+sn=b", two_pairs)); }, "-44", {"-1", "-16", "-44"}},
        {"minAttrValue", [] { return tell_freed(minAttrValue("\"a,b\"")); }, "a,b", {"(null)"}},
        {"rdn_type_new", [] { return tell_made(rdn_type_new(), rdn_type_delete); }, "made", {"(null)"}},
        {"rdn_list_new", [] { return tell_made(rdn_list_new(), rdn_list_delete); }, "made", {"(null)"}},
        {"dn_list_new", [] { return tell_made(dn_list_new(), dn_list_delete); }, "made", {"(null)"}},
        {"rdn_type_init", [] { return tell_made(rdn_type_init("cn=a"), rdn_type_delete); }, "made", {"(null)"}},
    });
}

TEST_F(DnCallsAlloc, SuffixesAndParents)
{
    char suffix[] = "A=X";
    char* suffixes[] = {suffix, nullptr};
    Backend be{.be_suffix = suffixes, .be_type = "rdbm"};
    expect_outcomes({
        {"dn_issuffix", [] { return tell(dn_issuffix("cn=a,a=x", "A=X")); }, "1", {"0"}},
        {"be_issuffix_internal", [&] { return tell(be_issuffix_internal(&be, "a=x", 0)); }, "1", {"90"}},
        {"dn_parent", [&] { return tell_freed(dn_parent(&be, "cn=a,a=x")); }, "a=x", {"(null)"}},
        {"dn_parent_norm", [&] { return tell_freed(dn_parent_norm(&be, "CN=A,A=X")); }, "A=X", {"(null)"}},
        {"dn_get_parent_norm",
         [&] {
             char* parent = nullptr;
             const int result = dn_get_parent_norm(&be, "CN=A,A=X", &parent, 1);
             return tell(result, " ") + tell_freed(parent);
         },
         "0 A=X",
         {"90 (null)"}},
    });
}

}  // namespace

#endif
