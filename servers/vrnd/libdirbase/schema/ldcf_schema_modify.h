// One change of the active schema, in the phases that all back ends go through together.
//
//   vote      a copy of the active schema is made in the spare instance, changed, checked and written beside the files
//   commit    the written files take the place of the schema files, and the copy becomes the active schema
//   rollback  nothing to do; what the vote made goes in the cleanup
//   cleanup   the instance that isn't active is emptied, after a failed vote together with what it wrote
//
// After a vote, failed or not, the caller goes on to commit or rollback, and in the end to cleanup. Until commit has
// succeeded the active schema and its files are as they were.
//
// The caller holds the write side of the schema lock through all phases. Failures of the vote, the commit and, after
// everything is emptied, the cleanup are exceptions of the tree of csgl_exception.h.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

struct Backend;

enum ldcf_modify_op : int {
    ldcf_modify_add = 1,
    ldcf_modify_delete = 2,
    ldcf_modify_replace = 3,
};

enum ldcf_modify_phase : int {
    ldcf_modify_vote = 0,
    ldcf_modify_commit = 1,
    ldcf_modify_rollback = 2,
    ldcf_modify_cleanup = 3,
};

extern "C" {

// Run one phase of a change of one definition, the same in all phases. An added definition becomes part of the schema:
// no other ldcf_schema may hold it any longer, for that unlinks it when it is cleared or goes. One to delete or replace
// is given as parsed. Return 0, or -1 for a phase outside the four. The back end isn't used. A commit without a vote
// that went through just before is exc_invalid_state_t and changes nothing.
//
// A replaced attribute type whose protection (encryption, returned value, secure connection, matching) changes is told
// to the message log after the commit.
DIRBASE_EXPORT int ldcf_schema_modify_syntax(Backend* be, ldcf_modify_op op, ldcf_modify_phase phase,
                                             ldcf_syntax& definition);
DIRBASE_EXPORT int ldcf_schema_modify_matchrule(Backend* be, ldcf_modify_op op, ldcf_modify_phase phase,
                                                ldcf_matchrule& definition);
DIRBASE_EXPORT int ldcf_schema_modify_attrtype(Backend* be, ldcf_modify_op op, ldcf_modify_phase phase,
                                               ldcf_attrtype& definition);
DIRBASE_EXPORT int ldcf_schema_modify_objclass(Backend* be, ldcf_modify_op op, ldcf_modify_phase phase,
                                               ldcf_objclass& definition);

}  // extern "C"
