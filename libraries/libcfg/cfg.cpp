// The configuration client's calls: see cfg.h.
#include "libraries/libcfg/cfg.h"

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "libraries/libcfg/cfg_tree.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libpwd/pwd_format.h"

struct cfg_handle {
    std::string file;
    std::shared_ptr<const cfg_tree> tree;  // null before a bind
    aes_key_data key = {};
    bool has_key = false;
    bool dump = false;
    bool dump_place = false;
    cfg_failure failure;

    cfg_handle() = default;
    ~cfg_handle() { explicit_bzero(&key, sizeof key); }
    cfg_handle(const cfg_handle&) = delete;
    cfg_handle& operator=(const cfg_handle&) = delete;
};

// An entry of a result, and the chain of those behind it; the first one stands for the result. The only message of a
// result without entries has none.
struct cfg_message {
    std::shared_ptr<const cfg_tree> tree;  // keeps the entry alive
    const cfg_entry* entry = nullptr;
    cfg_message* next = nullptr;
};

struct cfg_ber {
    std::size_t place;  // of the attribute given last
};

namespace {

struct free_text {
    void operator()(char* text) const { std::free(text); }
};
struct free_value_array {
    void operator()(char** values) const { cfg_value_free(values); }
};
struct free_message {
    void operator()(cfg_message* message) const { cfg_msgfree(message); }
};
using text_guard = std::unique_ptr<char, free_text>;
using value_array = std::unique_ptr<char*, free_value_array>;
using message_guard = std::unique_ptr<cfg_message, free_message>;

constexpr cfg_failure success = {};
constexpr cfg_failure no_memory = {LDAP_NO_MEMORY, "memory ran out"};
constexpr cfg_failure bad_argument = {LDAP_PARAM_ERROR, "an argument is missing or unknown"};

// Runs a call's work, which returns or raises its failure, and keeps that with the handle.
template <typename Work>
int run(cfg_handle* cfg, const Work& work)
{
    if (cfg == nullptr) {
        return LDAP_PARAM_ERROR;
    }
    try {
        cfg->failure = work();
    } catch (const std::bad_alloc&) {
        cfg->failure = no_memory;
    }
    return cfg->failure.code;
}

bool is_empty(const char* text)
{
    return text == nullptr || *text == '\0';
}

// Flags are turned on once something has failed, of which they are to tell: what is kept with the handle stays. False
// for another option.
bool set_flag(cfg_handle& cfg, int option, const void* value)
{
    switch (option) {
    case CFG_OPT_DUMP: cfg.dump = value != nullptr; return true;
    case CFG_OPT_DUMP_PLACE: cfg.dump_place = value != nullptr; return true;
    default: return false;
    }
}

cfg_failure set_option(cfg_handle& cfg, int option, const void* value)
{
    switch (option) {
    case CFG_OPT_FILE:
        if (is_empty(static_cast<const char*>(value))) {
            return bad_argument;
        }
        cfg.file = static_cast<const char*>(value);
        cfg.tree = nullptr;
        return success;
    case CFG_OPT_KEY:
        cfg.has_key = value != nullptr;
        cfg.key = cfg.has_key ? *static_cast<const aes_key_data*>(value) : aes_key_data{};
        return success;
    default: return bad_argument;
    }
}

cfg_failure bind(cfg_handle& cfg, const char* name, const char* password, int method)
{
    if (method != CFG_AUTH_SIMPLE) {
        return {LDAP_AUTH_METHOD_NOT_SUPPORTED, "the method of authentication is unknown"};
    }
    if (!is_empty(name) || !is_empty(password)) {
        return {LDAP_INAPPROPRIATE_AUTH, "a file has no users"};
    }
    if (cfg.file.empty()) {
        return {LDAP_PARAM_ERROR, "no file was named"};
    }
    auto tree = std::make_shared<cfg_tree>();
    const cfg_failure failure = read_cfg_file(cfg.file.c_str(), *tree);
    if (failure.code == LDAP_SUCCESS) {
        cfg.tree = std::move(tree);
    }
    return failure;
}

// Makes the messages of a search, one at least.
message_guard make_result(const std::shared_ptr<const cfg_tree>& tree, const std::vector<const cfg_entry*>& found)
{
    message_guard first(new cfg_message{tree});
    cfg_message* last = nullptr;
    for (const cfg_entry* const entry : found) {
        last = last == nullptr ? first.get() : last->next = new cfg_message{tree};
        last->entry = entry;
    }
    return first;
}

cfg_failure search(const cfg_handle& cfg, const char* base, int scope, const char* filter, cfg_message** result)
{
    if (cfg.tree == nullptr) {
        return {LDAP_OPERATIONS_ERROR, "nothing is bound"};
    }
    if (base == nullptr || filter == nullptr || scope < CFG_SCOPE_BASE || scope > CFG_SCOPE_SUB) {
        return bad_argument;
    }
    std::string key;
    if (!make_cfg_key(base, key)) {
        return {LDAP_INVALID_DN_SYNTAX, "the base is no dn"};
    }
    cfg_filter parsed;
    if (!parsed.parse(filter)) {
        return {LDAP_FILTER_ERROR, "the filter is of another form than attribute=value and attribute=*"};
    }
    std::vector<const cfg_entry*> found;
    const cfg_failure failure = search_cfg_tree(*cfg.tree, key, scope, parsed, found);
    if (failure.code == LDAP_SUCCESS) {
        *result = make_result(cfg.tree, found).release();
    }
    return failure;
}

text_guard copy_text(const std::string& text)
{
    text_guard copy(strdup(text.c_str()));
    if (copy == nullptr) {
        throw std::bad_alloc();
    }
    return copy;
}

// Makes the text of a value. Null for one that the key doesn't decode to a text.
text_guard clear_text(const cfg_handle& cfg, const cfg_value& value)
{
    if (!cfg.has_key || (check_format(value.text.data(), value.text.size()) & PWD_TWO_WAY) == 0) {
        return copy_text(value.text);
    }
    char* clear = nullptr;
    unsigned long length = 0;
    if (unformat_password(value.text.data(), value.text.size(), &cfg.key, &clear, &length) == 0) {
        if (errno == ENOMEM) {
            throw std::bad_alloc();
        }
        return nullptr;
    }
    if (std::strlen(clear) != length) {
        explicit_bzero(clear, length);
        std::free(clear);
        return nullptr;
    }
    return text_guard(clear);
}

cfg_failure get_values(const cfg_handle& cfg, const cfg_entry& entry, const char* name, char*** result)
{
    const cfg_attribute* const attribute = entry.find(name);
    if (attribute == nullptr) {
        return {LDAP_NO_SUCH_ATTRIBUTE, "the entry has no such attribute"};
    }
    value_array values(static_cast<char**>(std::calloc(attribute->values.size() + 1, sizeof(char*))));
    if (values == nullptr) {
        return no_memory;
    }
    std::size_t count = 0;
    for (const cfg_value& value : attribute->values) {
        text_guard text = clear_text(cfg, value);
        if (text == nullptr) {
            return {LDAP_DECODING_ERROR, "the key doesn't decode a value", value.line};
        }
        values.get()[count++] = text.release();
    }
    *result = values.release();
    return success;
}

// The name of the attribute at a place; none behind the last one.
cfg_failure get_name(const cfg_entry& entry, std::size_t place, char** name)
{
    if (place < entry.attributes.size()) {
        *name = copy_text(entry.attributes[place].name).release();
    }
    return success;
}

void tell(const cfg_handle& cfg, const char* step, bool place)
{
    const cfg_failure& failure = cfg.failure;
    if (failure.code == LDAP_SUCCESS || (read_ldap_debug() & LDAP_DEBUG_ERROR) == 0) {
        return;
    }
    try {
        std::string text = failure.reason;
        if (failure.system_error != 0) {
            text += " (" + std::generic_category().message(failure.system_error) + ")";
        }
        if (place && failure.line != 0) {
            text += " in line " + std::to_string(failure.line);
        }
        if (place && !cfg.file.empty()) {
            text += (failure.line != 0 ? " of file " : ", file ") + cfg.file;
        }
        debug_error("Error - %s: %s, rc=%d\n", step, text.c_str(), failure.code);
    } catch (const std::bad_alloc&) {
        debug_error("Error - %s: %s, rc=%d\n", step, failure.reason, failure.code);
    }
}

}  // namespace

extern "C" {

// ---- sessions -------------------------------------------------------------------------------------------------------

cfg_handle* cfg_init(const char* host, int port)
{
    return is_empty(host) && port == 0 ? new (std::nothrow) cfg_handle : nullptr;
}

int cfg_set_option(cfg_handle* cfg, int option, const void* value)
{
    if (cfg != nullptr && set_flag(*cfg, option, value)) {
        return LDAP_SUCCESS;
    }
    return run(cfg, [&] { return set_option(*cfg, option, value); });
}

int cfg_bind_s(cfg_handle* cfg, const char* name, const char* password, int method)
{
    return run(cfg, [&] { return bind(*cfg, name, password, method); });
}

int cfg_unbind(cfg_handle* cfg)
{
    delete cfg;
    return LDAP_SUCCESS;
}

// ---- searching ------------------------------------------------------------------------------------------------------

int cfg_search_s(cfg_handle* cfg, const char* base, int scope, const char* filter, char** attributes, int types_only,
                 cfg_message** result)
{
    if (result != nullptr) {
        *result = nullptr;
    }
    return run(cfg, [&]() -> cfg_failure {
        if (attributes != nullptr || types_only != 0) {
            return {LDAP_NOT_SUPPORTED, "entries are given whole"};
        }
        return result == nullptr ? bad_argument : search(*cfg, base, scope, filter, result);
    });
}

cfg_message* cfg_first_entry(cfg_handle* cfg, cfg_message* result)
{
    const int code = run(cfg, [&] { return result == nullptr ? bad_argument : success; });
    return code != LDAP_SUCCESS || result->entry == nullptr ? nullptr : result;
}

cfg_message* cfg_next_entry(cfg_handle* cfg, cfg_message* entry)
{
    const int code = run(cfg, [&] { return entry == nullptr ? bad_argument : success; });
    return code != LDAP_SUCCESS ? nullptr : entry->next;
}

int cfg_count_entries(cfg_handle* cfg, cfg_message* result)
{
    if (run(cfg, [&] { return result == nullptr ? bad_argument : success; }) != LDAP_SUCCESS) {
        return -1;
    }
    int count = 0;
    for (const cfg_message* at = result; at != nullptr && at->entry != nullptr; at = at->next) {
        ++count;
    }
    return count;
}

int cfg_msgfree(cfg_message* result)
{
    while (result != nullptr) {
        delete std::exchange(result, result->next);
    }
    return LDAP_SUCCESS;
}

// ---- reading entries ------------------------------------------------------------------------------------------------

char* cfg_get_dn(cfg_handle* cfg, cfg_message* entry)
{
    char* dn = nullptr;
    run(cfg, [&] {
        if (entry == nullptr || entry->entry == nullptr) {
            return bad_argument;
        }
        dn = copy_text(entry->entry->dn).release();
        return success;
    });
    return dn;
}

char* cfg_first_attribute(cfg_handle* cfg, cfg_message* entry, cfg_ber** cursor)
{
    char* name = nullptr;
    if (cursor != nullptr) {
        *cursor = nullptr;
    }
    run(cfg, [&] {
        if (entry == nullptr || entry->entry == nullptr || cursor == nullptr) {
            return bad_argument;
        }
        auto start = std::make_unique<cfg_ber>(cfg_ber{0});
        const cfg_failure failure = get_name(*entry->entry, 0, &name);
        if (name != nullptr) {
            *cursor = start.release();
        }
        return failure;
    });
    return name;
}

char* cfg_next_attribute(cfg_handle* cfg, cfg_message* entry, cfg_ber* cursor)
{
    char* name = nullptr;
    run(cfg, [&] {
        if (entry == nullptr || entry->entry == nullptr || cursor == nullptr) {
            return bad_argument;
        }
        const cfg_failure failure = get_name(*entry->entry, cursor->place + 1, &name);
        cursor->place += name != nullptr ? 1 : 0;
        return failure;
    });
    return name;
}

char** cfg_get_values(cfg_handle* cfg, cfg_message* entry, const char* attribute)
{
    char** values = nullptr;
    run(cfg, [&] {
        if (entry == nullptr || entry->entry == nullptr || attribute == nullptr) {
            return bad_argument;
        }
        return get_values(*cfg, *entry->entry, attribute, &values);
    });
    return values;
}

void cfg_value_free(char** values)
{
    for (char** value = values; value != nullptr && *value != nullptr; ++value) {
        explicit_bzero(*value, std::strlen(*value));
        std::free(*value);
    }
    std::free(values);
}

void cfg_memfree(void* text)
{
    std::free(text);
}

void cfg_ber_free(cfg_ber* cursor)
{
    delete cursor;
}

// ---- failures -------------------------------------------------------------------------------------------------------

int cfg_get_errno(cfg_handle* cfg)
{
    return cfg == nullptr ? static_cast<int>(LDAP_PARAM_ERROR) : cfg->failure.code;
}

void cfg_perror(cfg_handle* cfg, const char* step)
{
    if (cfg != nullptr) {
        tell(*cfg, step == nullptr ? "cfg" : step, true);
    }
}

void cfg_dump_exception(cfg_handle* cfg)
{
    if (cfg != nullptr && cfg->dump) {
        tell(*cfg, "cfg_dump_exception", cfg->dump_place);
    }
}

}  // extern "C"
