// Names in the relational store: see ldcf_rdbm.h.
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"

#include <algorithm>
#include <cstring>
#include <string_view>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

namespace {

constexpr unsigned table_name_limit = 128;
constexpr unsigned hash_suffix_length = 7;
constexpr unsigned column_name_limit = 17;
constexpr unsigned cut_column_length = 16;
constexpr int access_class_system = 4;
constexpr int server_with_relational_store = 2;
constexpr char default_entry_table[] = "LDAP_ENTRY";

// The ids of the messages about names that were cut.
constexpr int msg_given_table_cut = 30;
constexpr int msg_column_cut = 31;
constexpr int msg_table_cut = 32;

// Attributes of the SYSTEM class that have tables of their own nevertheless.
constexpr std::string_view own_tables[] = {"xanEntryUuid", "CryptoSync", "CryptoSalt"};

// As the store writes names: upper case, without a hyphen, and without a final "I".
csgl_string store_form(const csgl_string& name)
{
    const unsigned length = name.length();
    csgl_local_array_of<char> text(std::size_t{length} + 1);
    std::memcpy(text.get(), name.c_str(), std::size_t{length} + 1);
    utfToUpper(text.get());  // what isn't UTF-8 stays as it is from there on
    if (length > 0 && text[length - 1] == 'I') {
        text[length - 1] = 'X';
    }
    std::replace(text.get(), text.get() + length, '-', '_');
    return {text.get(), length};
}

csgl_string cut_generated_name(const csgl_string& name)
{
    const csgl_string front(name.c_str(), table_name_limit - hash_suffix_length);
    char suffix[hash_suffix_length + 1];
    unpack_int(ldcf_hash_name(front), suffix);
    return front + suffix;
}

void tell_cut(int severity, int id, const csgl_string& name, const csgl_string& cut)
{
    PrintMessage(MSG_COMPONENT_RDBM, severity, id, name.c_str(), cut.c_str());
}

}  // namespace

int unpack_int(std::uint64_t value, char* out)
{
    constexpr char digits[] = "0123456789ABCDEFGHIJKLMNOPQRSTUV";
    if (out == nullptr) {
        debug_error("unpack_int: input result is null.\n");
        return 1;
    }
    for (int i = hash_suffix_length - 1; i >= 0; --i) {
        out[i] = digits[value & 0x1f];
        value >>= 5;
    }
    out[hash_suffix_length] = '\0';
    return 0;
}

csgl_string ldcf_rdbm::normalize_column_name(const csgl_string& name)
{
    if (name.length() <= column_name_limit) {
        return store_form(name);
    }
    const csgl_string cut(name.c_str(), cut_column_length);
    tell_cut(MSG_ERROR, msg_column_cut, name, cut);
    return store_form(cut);
}

csgl_string ldcf_rdbm::normalize_table_name(const csgl_string& name, int access_class, int have_db_names)
{
    const char* const type = g_srvType == server_with_relational_store ? "rdbm" : "proxy";
    Backend* be = ldcf_api_get_backend(g_backends, type);
    if (be == nullptr) {
        debug_error("Error - normalize_table_name: there is no back end of type %s\n", type);
        throw exc_assertion_failed_t(__FILE__, __LINE__, "unexpected null pointer", 0);
    }
    const char* qualifier = be->be_table_qualifier == nullptr ? nullptr : be->be_table_qualifier(be);

    const bool own_table =
        std::find(std::begin(own_tables), std::end(own_tables), std::string_view(name.c_str())) != std::end(own_tables);
    if (access_class == access_class_system && !own_table) {
        const char* const table = be->be_entry_table == nullptr ? nullptr : be->be_entry_table(be);
        return table == nullptr ? default_entry_table : table;
    }

    csgl_string table = name;
    if (name.length() > table_name_limit) {
        if (have_db_names == 0) {
            table = cut_generated_name(name);
            tell_cut(MSG_INFORMATION, msg_table_cut, name, table);
        } else {
            table = csgl_string(name.c_str(), table_name_limit);
            tell_cut(MSG_INFORMATION, msg_given_table_cut, name, table);
        }
    }
    table = store_form(table);
    if (qualifier == nullptr || *qualifier == '\0') {
        return table;
    }
    return csgl_string(qualifier) + "." + table;
}
