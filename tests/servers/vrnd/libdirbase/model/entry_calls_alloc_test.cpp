// Entries and the parts of filter evaluation, call by call, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/entry_mods.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/alloc_table.h"

using namespace model_test;
using namespace test_support;

namespace {

class EntryCallsAlloc : public Filters {};

TEST_F(EntryCallsAlloc, TextsAndLists)
{
    const quiet_logs quiet;
    std::string text = "dn: cn=a\ncn: a\nmember: CN=NULL\nsn: b\n";
    const entry_guard entry(str2entry(text.data(), 0, 0));
    expect_outcomes({
        {"str2entry_memberFix",
         [] {
             char* const copy = heap_copy("dn: cn=a\ncn: a\nmember: CN=NULL\n");
             Entry* const made = str2entry_memberFix(copy, 1, 1, 1);
             std::free(copy);
             return tell_made(made, entry_free);
         },
         "made",
         {"(null)"}},
        {"entry2str_options",
         [&] {
             const calm_text told = tell(entry2str_options(entry.get(), nullptr, 0));
             std::free(std::exchange(ebuf_global, nullptr));
             emaxsize_global = 0;
             return told;
         },
         "dn: cn=a\ncn: a\nmember: CN=NULL\nsn: b\n",
         {"(null)", "dn: cn=a\ncn: a\nmember: CN=NULL\nsn: b\n"}},
        {"entry2str_wo_members_and_pwd_attribs",
         [&] {
             char* buffer = nullptr;
             std::size_t size = 0;
             const calm_text told = tell(entry2str_wo_members_and_pwd_attribs(entry.get(), nullptr, 0, &buffer, &size));
             std::free(buffer);
             return told;
         },
         "dn: cn=a\ncn: a\nmember: CN=NULL\nsn: b\n",
         {"(null)", "dn: cn=a\ncn: a\nmember: CN=NULL\nsn: b\n"}},
        {"MAKE_SPACE",
         [] {
             char* buffer = heap_copy("abc");
             char* cursor = buffer + 1;
             std::size_t size = 4;
             int error = -1;
             MAKE_SPACE(5000, &error, &buffer, &cursor, &size);
             return tell(error, " ", size, " ", cursor - buffer, " ") + tell_freed(buffer);
         },
         "0 5124 1 abc",
         {"90 4 1 abc"}},
        {"EntryToLDAPMod", [&] { return tell_made(EntryToLDAPMod(entry->e_attrs), free_ldmarr); }, "made", {"(null)"}},
        {"filter2str",
         [] {
             const filter_guard filter = calm([] { return filter_of("(cn=a)"); });
             return tell_freed(filter2str(filter.get()));
         },
         "(cn=A)",
         {"(null)"}},
    });
}

TEST_F(EntryCallsAlloc, PartsOfEvaluation)
{
    const std::string long_text(600, 'a');
    const filled_entry entry({{"description", {long_text}}, {"description;lang-de", {"x"}}});
    const filter_guard both = filter_of("(&(description=" + long_text + ")(description=*aaa*))");
    const Filter* const equality = both->f_list;
    const Filter* const pieces = equality->f_next;
    const std::string before = model_test::described(entry);
    const auto same = [&](int result) {
        return calm([&] { return tell(result, model_test::described(entry) == before ? "" : " changed"); });
    };
    expect_outcomes({
        {"test_filter_list",
         [&] { return same(test_filter_list(&entry, both->f_list, LDAP_FILTER_AND)); },
         "0",
         {"90"}},
        {"test_ava_filter",
         [&] { return same(test_ava_filter(&entry, &equality->f_ava, LDAP_FILTER_EQUALITY)); },
         "0",
         {"90"}},
        {"test_substring_filter", [&] { return same(test_substring_filter(&entry, pieces)); }, "0", {"90"}},
    });
}

}  // namespace

#endif
