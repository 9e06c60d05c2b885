// The settings of the server that all of its loadable parts share at one address, and a few helpers beside them.
//
// The front end sets them at start-up, before other threads read them, and they keep their values until the process
// ends; nothing here locks except where it says so. The library itself reads only get_g_language_tags_enabled; the rest
// is kept for front end, back ends and plug-ins, who agree on its meaning. Texts and records belong to whoever sets the
// pointer. The list of back ends and the kind of server are in backend.h.
#pragma once

#include <stdbool.h>
#include <stdint.h>

#include <pthread.h>

#include "libraries/dirbase_export.h"

typedef struct AdminPwdAttribs AdminPwdAttribs;
typedef struct AdminPwdPolicy AdminPwdPolicy;
typedef struct MasterSrvInfo MasterSrvInfo;
typedef struct admin_group_member admin_group_member;

// An object class as the server held it before there was a schema engine. Text and arrays are blocks of malloc.
typedef struct objclass objclass;
struct objclass {
    char* oc_name;
    char** oc_required;  // null-terminated
    char** oc_allowed;   // null-terminated
    objclass* oc_next;
};

DIRBASE_C_BEGIN

// ---- settings behind functions --------------------------------------------------------------------------------------

// Whether language tags of attributes are honoured in filters; 0 at start.
DIRBASE_EXPORT void set_g_language_tags_enabled(int32_t enabled);
DIRBASE_EXPORT int32_t get_g_language_tags_enabled(void);

// How aliases are followed, as configured: 0 never, 1 in searching, 2 in finding the base, 3, the value at start,
// always.
DIRBASE_EXPORT void setAliasOptCfg(int32_t option);
DIRBASE_EXPORT int32_t getAliasOptCfg(void);

// Sets it by word: "never", "search", "find" or "always" in any case. Returns 0, or 1 for any other word or null, which
// changes nothing.
DIRBASE_EXPORT int updateDerefOpt(const char* word);

// The server-wide alias option of the front end; 1 at start.
DIRBASE_EXPORT void setAliasOptGlobal(int32_t option);
DIRBASE_EXPORT int32_t getAliasOptGlobal(void);

// Whether transactions are on; 0 at start. A change is told to the debug log.
DIRBASE_EXPORT void set_transactionsEnabled(unsigned char enabled);
DIRBASE_EXPORT unsigned char get_transactionsEnabled(void);

// How long a write to a client may block; 120 at start, in the unit of the front end. Any thread, at any time: setting
// is serialised, reading takes no lock.
DIRBASE_EXPORT void set_write_timeout(int64_t timeout);
DIRBASE_EXPORT int64_t get_write_timeout(void);

// Whether anonymous binds are accepted. Any thread, at any time: both take a lock. The byte itself is for the single
// thread of start-up.
DIRBASE_EXPORT extern unsigned char g_allow_anon;
DIRBASE_EXPORT void set_allow_anon(unsigned char allow);
DIRBASE_EXPORT bool get_allow_anon(void);

// Makes the locks of the two settings above, which are there from the first moment: a server needn't call it. The first
// call, at start-up before another thread runs, makes them anew; later ones do nothing.
DIRBASE_EXPORT void initDOSLocks(void);

// ---- settings for all to read ---------------------------------------------------------------------------------------

DIRBASE_EXPORT extern int32_t g_InternalSearchLimit;  // -1 at start
DIRBASE_EXPORT extern pthread_key_t svrthread_key;    // the thread's server record: its first word is the back end
DIRBASE_EXPORT extern void* g_be_changelog;
DIRBASE_EXPORT extern void* g_cfgKeyData;
DIRBASE_EXPORT extern void* g_ptaBind;
DIRBASE_EXPORT extern char* g_configFile;
DIRBASE_EXPORT extern char* g_srvInstanceName;
DIRBASE_EXPORT extern char* g_serverId;

// Password policy of the administrative identities, and the members of the administrative groups, newest first.
DIRBASE_EXPORT extern AdminPwdAttribs* g_admin_pwd_attribs;
DIRBASE_EXPORT extern AdminPwdPolicy* g_admin_pwdpolicy;
DIRBASE_EXPORT extern admin_group_member* g_AdminGroupMembers;

// Names of the attributes that tell how a subtree is divided among servers.
DIRBASE_EXPORT extern const char* g_attrNumPartitions;
DIRBASE_EXPORT extern const char* g_attrPartitionName;
DIRBASE_EXPORT extern const char* g_attrPartitionBase;
DIRBASE_EXPORT extern const char* g_attrPartitionHash;

DIRBASE_EXPORT extern unsigned char g_repl_conflict_res_for_groups;  // 1 at start
DIRBASE_EXPORT extern unsigned char g_replRestrictedAccess;
DIRBASE_EXPORT extern unsigned char g_StopServer;
DIRBASE_EXPORT extern int32_t g_server_state;
DIRBASE_EXPORT extern int32_t g_safe_mode;
DIRBASE_EXPORT extern int32_t g_port;
DIRBASE_EXPORT extern int32_t g_rootUID;
DIRBASE_EXPORT extern int32_t g_serverInstanceUID;
DIRBASE_EXPORT extern int32_t g_serverInstanceGID;

// What is audited, as a whole and for the performance of each kind of operation.
DIRBASE_EXPORT extern int32_t g_audit_options;
DIRBASE_EXPORT extern int32_t g_au_perf_add_op;
DIRBASE_EXPORT extern int32_t g_au_perf_bind_op;
DIRBASE_EXPORT extern int32_t g_au_perf_compare_op;
DIRBASE_EXPORT extern int32_t g_au_perf_delete_op;
DIRBASE_EXPORT extern int32_t g_au_perf_moddn_op;
DIRBASE_EXPORT extern int32_t g_au_perf_modify_op;
DIRBASE_EXPORT extern int32_t g_au_perf_search_op;
DIRBASE_EXPORT extern int32_t g_au_perf_unbind_op;

DIRBASE_EXPORT extern char* g_digest_attr;
DIRBASE_EXPORT extern char* g_digest_realm;
DIRBASE_EXPORT extern char* g_digest_admin_user;

DIRBASE_EXPORT extern MasterSrvInfo* g_masterSrvInfoList;  // the supplier servers
DIRBASE_EXPORT extern char** g_ipAddressList;              // addresses to listen on, and their number
DIRBASE_EXPORT extern int32_t g_ipAddressListSize;
DIRBASE_EXPORT extern pthread_mutex_t g_shutdown_mutex;

// ---- figures of the monitor -----------------------------------------------------------------------------------------

// Back ends point these at their own figures, of a type that front end and back end agree on, for the front end to
// read; null at start. The library leaves them alone.
DIRBASE_EXPORT extern void* g_entry_cache_size_p;
DIRBASE_EXPORT extern void* g_entry_cache_current_size_p;
DIRBASE_EXPORT extern void* g_num_entry_cache_hit_p;
DIRBASE_EXPORT extern void* g_num_entry_cache_miss_p;
DIRBASE_EXPORT extern void* g_filter_cache_size_p;
DIRBASE_EXPORT extern void* g_filter_cache_current_size_p;
DIRBASE_EXPORT extern void* g_filter_cache_bypass_limit_p;
DIRBASE_EXPORT extern void* g_num_filter_cache_hit_p;
DIRBASE_EXPORT extern void* g_num_filter_cache_miss_p;
DIRBASE_EXPORT extern void* g_acl_cache_p;
DIRBASE_EXPORT extern void* g_acl_cache_size_p;
DIRBASE_EXPORT extern void* g_gm_cache_size_p;
DIRBASE_EXPORT extern void* g_gm_cache_current_size_p;
DIRBASE_EXPORT extern void* g_gm_cache_hit_p;
DIRBASE_EXPORT extern void* g_gm_cache_miss_p;
DIRBASE_EXPORT extern void* g_gm_cache_bypass_p;
DIRBASE_EXPORT extern void* g_ops_waiting_p;
DIRBASE_EXPORT extern void* g_ops_waiting_cl_p;
DIRBASE_EXPORT extern void* g_max_ops_waited_p;
DIRBASE_EXPORT extern void* g_max_ops_waited_cl_p;
DIRBASE_EXPORT extern void* g_ops_retried_p;
DIRBASE_EXPORT extern void* g_ops_retried_cl_p;
DIRBASE_EXPORT extern void* g_ops_deadlocked_p;

// ---- the old list of object classes ---------------------------------------------------------------------------------

// Head of the list; the library puts nothing on it.
DIRBASE_EXPORT extern objclass* global_oc;

// Releases a record with its text and arrays; null does nothing.
DIRBASE_EXPORT void free_objclass(objclass* record);

// Releases every record of the list. The head stays as it is: whoever goes on sets it anew.
DIRBASE_EXPORT void free_objclass_list(void);

// ---- helpers --------------------------------------------------------------------------------------------------------

// Makes the lock of vrn_strerror, in the same manner.
DIRBASE_EXPORT void vrn_strerror_init(void);

// Returns the platform's text for an errno in a new text for the caller to free(); null when memory ran out. Any
// thread.
DIRBASE_EXPORT char* vrn_strerror(int error);

// Compares texts byte for byte: the difference of the first bytes that differ, both as signed characters; 0 for equal
// texts. Nulls: 0 for two, -1 for a null `a`, 1 for a null `b`.
DIRBASE_EXPORT int ascii_strcmp(const char* a, const char* b);

// The first 32-bit word of a thread's identity, for log lines.
DIRBASE_EXPORT uint32_t vrnd_pthread_getthreadid(const pthread_t* thread);

DIRBASE_C_END
