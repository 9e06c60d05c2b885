// Look-ups by names of any kind in the shipped schema: what the cache answers, the maps answer too, and nothing is read
// beyond a name's end.
#include <cstdlib>
#include <fstream>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

using fuzz_support::expect;

bool load_shipped_schema()
{
    ldcf_api_schema_init();
    std::ifstream list(DIRBASE_SOURCE_SCHEMA_DIR "/schema.list");
    for (std::string file; std::getline(list, file);) {
        if (!file.empty() && file[0] != '#') {
            expect(ldcf_api_schema_parse((DIRBASE_SOURCE_SCHEMA_DIR "/" + file).c_str()) == 0, "the schema loads");
        }
    }
    return ldcf_api_schema_complete() == 0 && ldcf_api_schema_complete_db_names() == 0;
}

bool is_known(const asyntaxinfo* info)
{
    return info == nullptr || (info->names != nullptr && info->attr != nullptr && info->table != nullptr);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const bool loaded = load_shipped_schema();
    expect(loaded, "the shipped schema is complete");
    const fuzz_support::exact_text name(data, size);

    char* base = nullptr;
    const asyntaxinfo* cached = ldcf_api_attr_get_info(name.c_str(), &base);
    std::free(base);
    expect(is_known(cached), "a record is whole");
    if (const ldcf_hash_tbl_entry* node = ldcf_hash_get(name.c_str()); node != nullptr) {
        expect(node->info == cached, "the cache and the look-up give one record");
    }
    const char* oid = ldcf_api_attr_get_oid(name.c_str());
    expect(oid == nullptr || ldcf_api_attr_get_info(oid, nullptr) != nullptr, "an oid leads to a record");
    ldcf_api_attr_get_info_from_proposed_schema(name.c_str());
    ldcf_api_attr_get_info_based_on_table(name.c_str());
    ldcf_api_objectclass_get_info(name.c_str());
    for (auto* predicate : {ldcf_api_is_langtag_attr, ldcf_api_is_unique_attr, ldcf_api_is_attrcache_attr,
                            ldcf_api_is_encrypted_attr, ldcf_api_is_binary_syntax, checkIfLangTagAttrByOid}) {
        predicate(name.c_str());
    }
    return 0;
}
