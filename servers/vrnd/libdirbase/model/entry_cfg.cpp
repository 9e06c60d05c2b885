// Entries from the server's configuration: see entry_cfg.h.
#include "servers/vrnd/libdirbase/model/entry_cfg.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"

namespace {

struct free_cfg_text {
    void operator()(char* text) const noexcept { cfg_memfree(text); }
};
struct free_cfg_values {
    void operator()(char** values) const noexcept { cfg_value_free(values); }
};
struct free_cfg_cursor {
    void operator()(cfg_ber* cursor) const noexcept { cfg_ber_free(cursor); }
};
using cfg_text = std::unique_ptr<char, free_cfg_text>;
using cfg_values = std::unique_ptr<char*, free_cfg_values>;
using cfg_cursor = std::unique_ptr<cfg_ber, free_cfg_cursor>;

// How the client's last call went, told where it failed.
int result_of(cfg_handle* cfg, const char* step)
{
    const int result = cfg_get_errno(cfg);
    if (result != LDAP_SUCCESS) {
        cfg_perror(cfg, step);
    }
    return result;
}

// Each of these returns LDAP_SUCCESS or LDAP_NO_MEMORY; any other failure is told and passed over.

int take_dn(cfg_handle* cfg, cfg_message* message, Entry& entry)
{
    const cfg_text dn(cfg_get_dn(cfg, message));
    const int result = result_of(cfg, "cfg_get_dn");
    if (dn == nullptr) {
        return result == LDAP_NO_MEMORY ? LDAP_NO_MEMORY : LDAP_SUCCESS;
    }
    entry.e_dn = strdup(dn.get());
    if (entry.e_dn == nullptr) {
        debug_error("Error - CFGMessage2Entry: strdup failed in file %s near line %d\n", __FILE__, __LINE__);
        return LDAP_NO_MEMORY;
    }
    return LDAP_SUCCESS;
}

int merge_texts(Entry& entry, const char* name, char** texts)
{
    std::size_t count = 0;
    while (texts[count] != nullptr) {
        ++count;
    }
    const heap_pointer<berval*> values(static_cast<berval**>(std::calloc(count + 1, sizeof(berval*))));
    if (values == nullptr) {
        debug_error("Error - CFGMessage2Entry: malloc for berptr failed in file %s near line %d\n", __FILE__, __LINE__);
        return LDAP_NO_MEMORY;
    }
    const heap_pointer<berval> records(static_cast<berval*>(std::calloc(count + 1, sizeof(berval))));
    if (records == nullptr) {
        debug_error("Error - CFGMessage2Entry: malloc for ber failed in file %s near line %d\n", __FILE__, __LINE__);
        return LDAP_NO_MEMORY;
    }
    for (std::size_t i = 0; i < count; ++i) {
        records.get()[i] = {std::strlen(texts[i]), texts[i]};
        values.get()[i] = &records.get()[i];
    }
    const int result = attr_merge(&entry, name, values.get(), 1, 1, nullptr);
    if (result != LDAP_SUCCESS) {
        debug_error("Error - CFGMessage2Entry: attr_merge of %s failed rc=%d\n", name, result);
    }
    return result == LDAP_NO_MEMORY ? LDAP_NO_MEMORY : LDAP_SUCCESS;
}

int take_attribute(cfg_handle* cfg, cfg_message* message, const char* name, Entry& entry)
{
    const cfg_values values(cfg_get_values(cfg, message, name));
    const int result = result_of(cfg, "cfg_get_values");
    if (values == nullptr) {
        return result == LDAP_NO_MEMORY ? LDAP_NO_MEMORY : LDAP_SUCCESS;
    }
    return merge_texts(entry, name, values.get());
}

int take_attributes(cfg_handle* cfg, cfg_message* message, Entry& entry)
{
    cfg_ber* made = nullptr;
    cfg_text name(cfg_first_attribute(cfg, message, &made));
    const cfg_cursor cursor(made);
    int result = result_of(cfg, "cfg_first_attribute");
    while (name != nullptr) {
        if (take_attribute(cfg, message, name.get(), entry) != LDAP_SUCCESS) {
            return LDAP_NO_MEMORY;
        }
        name.reset(cfg_next_attribute(cfg, message, cursor.get()));
        result = result_of(cfg, "cfg_next_attribute");
    }
    return result == LDAP_NO_MEMORY ? LDAP_NO_MEMORY : LDAP_SUCCESS;
}

}  // namespace

extern "C" {

Entry* CFGMessage2Entry(cfg_handle* cfg, cfg_message* message)
{
    Entry* made = nullptr;
    if (cfg == nullptr || message == nullptr) {
        return nullptr;
    }
    if (CreateEntry(&made) != LDAP_SUCCESS) {
        debug_error("Error - CFGMessage2Entry: CreateEntry failed in file %s near line %d\n", __FILE__, __LINE__);
        return nullptr;
    }
    entry_guard entry(made);
    if (take_dn(cfg, message, *made) != LDAP_SUCCESS || take_attributes(cfg, message, *made) != LDAP_SUCCESS) {
        return nullptr;
    }
    return entry.release();
}

}  // extern "C"
