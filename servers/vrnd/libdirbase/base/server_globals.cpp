// The settings of the server: see server_globals.h.
#include "servers/vrnd/libdirbase/base/server_globals.h"

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <mutex>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "libraries/mutex_holder.h"
#include "servers/vrnd/libdirbase/base/charray.h"

unsigned char g_allow_anon = 1;

std::int32_t g_InternalSearchLimit = -1;
pthread_key_t svrthread_key = 0;
static_assert(sizeof svrthread_key == 4);
void* g_be_changelog = nullptr;
void* g_cfgKeyData = nullptr;
void* g_ptaBind = nullptr;
char* g_configFile = nullptr;
char* g_srvInstanceName = nullptr;
char* g_serverId = nullptr;
AdminPwdAttribs* g_admin_pwd_attribs = nullptr;
AdminPwdPolicy* g_admin_pwdpolicy = nullptr;
admin_group_member* g_AdminGroupMembers = nullptr;
const char* g_attrNumPartitions = "xan-NumPartitions";
const char* g_attrPartitionName = "xan-PartitionName";
const char* g_attrPartitionBase = "xan-PartitionBase";
const char* g_attrPartitionHash = "xan-PartitionHash";
unsigned char g_repl_conflict_res_for_groups = 1;
unsigned char g_replRestrictedAccess = 0;
unsigned char g_StopServer = 0;
std::int32_t g_server_state = 0;
std::int32_t g_safe_mode = 0;
std::int32_t g_port = 0;
std::int32_t g_rootUID = 0;
std::int32_t g_serverInstanceUID = 0;
std::int32_t g_serverInstanceGID = 0;
std::int32_t g_audit_options = 0;
std::int32_t g_au_perf_add_op = 0;
std::int32_t g_au_perf_bind_op = 0;
std::int32_t g_au_perf_compare_op = 0;
std::int32_t g_au_perf_delete_op = 0;
std::int32_t g_au_perf_moddn_op = 0;
std::int32_t g_au_perf_modify_op = 0;
std::int32_t g_au_perf_search_op = 0;
std::int32_t g_au_perf_unbind_op = 0;
char* g_digest_attr = nullptr;
char* g_digest_realm = nullptr;
char* g_digest_admin_user = nullptr;
MasterSrvInfo* g_masterSrvInfoList = nullptr;
char** g_ipAddressList = nullptr;
std::int32_t g_ipAddressListSize = 0;
pthread_mutex_t g_shutdown_mutex = PTHREAD_MUTEX_INITIALIZER;

void* g_entry_cache_size_p = nullptr;
void* g_entry_cache_current_size_p = nullptr;
void* g_num_entry_cache_hit_p = nullptr;
void* g_num_entry_cache_miss_p = nullptr;
void* g_filter_cache_size_p = nullptr;
void* g_filter_cache_current_size_p = nullptr;
void* g_filter_cache_bypass_limit_p = nullptr;
void* g_num_filter_cache_hit_p = nullptr;
void* g_num_filter_cache_miss_p = nullptr;
void* g_acl_cache_p = nullptr;
void* g_acl_cache_size_p = nullptr;
void* g_gm_cache_size_p = nullptr;
void* g_gm_cache_current_size_p = nullptr;
void* g_gm_cache_hit_p = nullptr;
void* g_gm_cache_miss_p = nullptr;
void* g_gm_cache_bypass_p = nullptr;
void* g_ops_waiting_p = nullptr;
void* g_ops_waiting_cl_p = nullptr;
void* g_max_ops_waited_p = nullptr;
void* g_max_ops_waited_cl_p = nullptr;
void* g_ops_retried_p = nullptr;
void* g_ops_retried_cl_p = nullptr;
void* g_ops_deadlocked_p = nullptr;

objclass* global_oc = nullptr;

namespace {

std::int32_t g_language_tags_enabled = 0;
std::int32_t alias_opt_cfg = 3;
std::int32_t g_alias_opt = 1;
unsigned char g_transactionsEnabled = 0;
std::atomic<std::int64_t> g_write_timeout = 120;

// Usable from the start, so that a tool that never calls the init functions may read the settings.
pthread_mutex_t write_block_lock = PTHREAD_MUTEX_INITIALIZER;
pthread_mutex_t anon_lock = PTHREAD_MUTEX_INITIALIZER;
pthread_mutex_t g_strerrMutex = PTHREAD_MUTEX_INITIALIZER;

void make_anew(pthread_mutex_t& mutex)
{
    pthread_mutex_destroy(&mutex);
    pthread_mutex_init(&mutex, nullptr);
}

// By value.
constexpr const char* alias_words[] = {"never", "search", "find", "always"};

}  // namespace

extern "C" {

void set_g_language_tags_enabled(std::int32_t enabled)
{
    g_language_tags_enabled = enabled;
}

std::int32_t get_g_language_tags_enabled(void)
{
    return g_language_tags_enabled;
}

void setAliasOptCfg(std::int32_t option)
{
    alias_opt_cfg = option;
}

std::int32_t getAliasOptCfg(void)
{
    return alias_opt_cfg;
}

int updateDerefOpt(const char* word)
{
    std::int32_t value = 0;
    for (const char* known : alias_words) {
        if (vrn_strcasecmp(word, known) == 0) {
            setAliasOptCfg(value);
            return 0;
        }
        ++value;
    }
    return 1;
}

void setAliasOptGlobal(std::int32_t option)
{
    g_alias_opt = option;
}

std::int32_t getAliasOptGlobal(void)
{
    return g_alias_opt;
}

void set_transactionsEnabled(unsigned char enabled)
{
    g_transactionsEnabled = enabled;
    debug_trace("g_transactionsEnabled is set to %s\n", enabled != 0 ? "true" : "false");
}

unsigned char get_transactionsEnabled(void)
{
    return g_transactionsEnabled;
}

void set_write_timeout(std::int64_t timeout)
{
    const mutex_holder lock(write_block_lock);
    g_write_timeout.store(timeout, std::memory_order_relaxed);
}

std::int64_t get_write_timeout(void)
{
    return g_write_timeout.load(std::memory_order_relaxed);
}

void set_allow_anon(unsigned char allow)
{
    const mutex_holder lock(anon_lock);
    g_allow_anon = allow;
}

bool get_allow_anon(void)
{
    const mutex_holder lock(anon_lock);
    return g_allow_anon != 0;
}

void initDOSLocks(void)
{
    static std::once_flag once;
    std::call_once(once, [] {
        make_anew(write_block_lock);
        make_anew(anon_lock);
    });
}

void free_objclass(objclass* record)
{
    if (record == nullptr) {
        return;
    }
    std::free(record->oc_name);
    charray_free(record->oc_required);
    charray_free(record->oc_allowed);
    std::free(record);
}

void free_objclass_list(void)
{
    for (objclass* record = global_oc; record != nullptr;) {
        objclass* next = record->oc_next;
        free_objclass(record);
        record = next;
    }
}

void vrn_strerror_init(void)
{
    static std::once_flag once;
    std::call_once(once, [] { make_anew(g_strerrMutex); });
}

char* vrn_strerror(int error)
{
    const mutex_holder lock(g_strerrMutex);
    return strdup(std::strerror(error));
}

int ascii_strcmp(const char* a, const char* b)
{
    if (a == nullptr || b == nullptr) {
        return static_cast<int>(a != nullptr) - static_cast<int>(b != nullptr);
    }
    while (*a == *b && *a != '\0') {
        ++a;
        ++b;
    }
    return static_cast<signed char>(*a) - static_cast<signed char>(*b);
}

std::uint32_t vrnd_pthread_getthreadid(const pthread_t* thread)
{
    std::uint32_t word = 0;
    static_assert(sizeof word <= sizeof *thread);
    std::memcpy(&word, thread, sizeof word);
    return word;
}

}  // extern "C"
