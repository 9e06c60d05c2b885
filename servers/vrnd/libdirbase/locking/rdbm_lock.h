// The server's read-write lock: many readers or one writer, and a waiting writer stops new readers.
//
// One mutex and one condition variable serve all waiters. `writer` is set from the moment a writer is first in line,
// so a stream of readers can't starve it; several writers, and the readers that a release lets go on, run in the
// scheduler's order. The lock knows no owner: it is neither recursive nor upgradable. A thread that holds the read
// side and wants the write side releases the read side first, and has to expect another writer in between.
//
// No function but the two trylocks has a result. A call that fails inside reports it to the debug log, with the place,
// and returns without the lock; that happens only to a lock that is damaged or was never initialised.
#pragma once

#include <stdint.h>

#include <pthread.h>

#include "libraries/dirbase_export.h"

typedef struct rdbm_lock_t rdbm_lock_t;
struct rdbm_lock_t {
    pthread_mutex_t mutex;  // guards `count` and `writer`
    int16_t count;          // readers inside; -1 while a writer is inside; 0 free
    uint8_t writer;         // 1 while a writer is inside or first in line
    pthread_cond_t cond;    // every waiter waits here
};

#ifdef __cplusplus
static_assert(sizeof(rdbm_lock_t::count) == 2, "the number of readers is a signed 16-bit word");
#endif

DIRBASE_C_BEGIN

// Makes `lock` free. `name` tells the lock in the caller's code and isn't kept.
DIRBASE_EXPORT void rdbm_lock_init(rdbm_lock_t* lock, const char* name);

// Releases what rdbm_lock_init took. Nobody may hold the lock or wait for it, and it needs rdbm_lock_init before it is
// used again.
DIRBASE_EXPORT void rdbm_lock_destroy(rdbm_lock_t* lock);

// Wait until the lock can be had for reading, or for writing.
DIRBASE_EXPORT void _rdbm_rd_lock(rdbm_lock_t* lock);
DIRBASE_EXPORT void _rdbm_wr_lock(rdbm_lock_t* lock);

// Take the lock when that needs no waiting. Return 0 when the lock was taken; -1 when others hold it, or a writer is in
// line; or the positive error code of the mutex, EBUSY when another thread was just inside one of these functions.
DIRBASE_EXPORT int _rdbm_rd_trylock(rdbm_lock_t* lock);
DIRBASE_EXPORT int _rdbm_wr_trylock(rdbm_lock_t* lock);

// Release the read side, the write side, or whichever side is held. A lock that isn't held that way is reported to the
// debug log and left alone.
DIRBASE_EXPORT void _rdbm_rd_unlock(rdbm_lock_t* lock);
DIRBASE_EXPORT void _rdbm_wr_unlock(rdbm_lock_t* lock);
DIRBASE_EXPORT void _rdbm_unlock(rdbm_lock_t* lock);

DIRBASE_C_END
