// A doubly linked list of pointers with a mutex of its own and, when asked for, a condition to wait for its first
// entry.
//
// Only `add` locks. Everything else needs the caller to hold the mutex, or to be alone on the list. The list offers no
// way to wait or to take entries off; consumers do that on its members:
//
//     pthread_mutex_lock(list.getMutex());
//     while (list.head == nullptr)
//         pthread_cond_wait(list.getCondition(), list.getMutex());
//     ListEntry<T>* taken = list.head;              // the whole chain: the consumer deletes entries and values
//     list.head = list.tail = nullptr;
//     pthread_mutex_unlock(list.getMutex());
//
// The condition tells of the step from no entry to one and of nothing else, so a waiter empties the list before it
// waits again.
#pragma once

#include <new>
#include <type_traits>

#include <pthread.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/ldap_result.h"

// One entry. It never touches its value. Made by the list with new; who takes it off the list deletes it.
template <typename T>
class DIRBASE_EXPORT ListEntry {
public:
    ListEntry() : value(nullptr), next(nullptr), previous(nullptr) {}
    virtual ~ListEntry() = default;
    ListEntry(const ListEntry&) = delete;
    ListEntry& operator=(const ListEntry&) = delete;

    T value;
    ListEntry* next;
    ListEntry* previous;
};

template <typename T>
class DIRBASE_EXPORT List {
    static_assert(std::is_pointer_v<T>, "a list holds pointers");

public:
    // An empty list.
    //
    //   withCondition  1 gives the list a condition; any other value gives none.
    //   flagged        kept for the caller; the list itself never looks at it.
    List(int withCondition, bool flagged)
        : head(nullptr), tail(nullptr), hasCondition_(withCondition == 1), flag_(flagged)
    {
        init();
    }

    // Drops the entries and leaves the values alive. Nobody may hold the mutex or wait.
    virtual ~List()
    {
        clear(false);
        if (hasCondition_)
            pthread_cond_destroy(&condition_);
        pthread_mutexattr_destroy(&mutexAttributes_);
        pthread_mutex_destroy(&mutex_);
    }

    List(const List&) = delete;
    List& operator=(const List&) = delete;

    // Makes the list empty and its mutex, attributes and condition new. The constructor has done that: a call on a list
    // in use leaks its entries and breaks its mutex.
    void init()
    {
        head = nullptr;
        tail = nullptr;
        pthread_mutexattr_init(&mutexAttributes_);
        pthread_mutex_init(&mutex_, &mutexAttributes_);
        if (hasCondition_)
            pthread_cond_init(&condition_, nullptr);
    }

    // Append a value at the tail, `add` with the mutex held for as long as that takes. Return LDAP_SUCCESS, or
    // LDAP_NO_MEMORY, with the list as it was. A first entry wakes all waiters.
    int add(T value)
    {
        pthread_mutex_lock(&mutex_);
        const int rc = addNoLock(value);
        pthread_mutex_unlock(&mutex_);
        return rc;
    }

    int addNoLock(T value)
    {
        auto* entry = new (std::nothrow) ListEntry<T>();
        if (entry == nullptr)
            return LDAP_NO_MEMORY;
        entry->value = value;
        entry->previous = tail;
        const bool first = head == nullptr;
        (first ? head : tail->next) = entry;
        tail = entry;
        if (first && hasCondition_)
            pthread_cond_broadcast(&condition_);
        return LDAP_SUCCESS;
    }

    // Drops all entries, and with `deleteValues` deletes the values too.
    void clear(bool deleteValues)
    {
        for (ListEntry<T>* entry = head; entry != nullptr;) {
            ListEntry<T>* next = entry->next;
            if (deleteValues)
                delete entry->value;
            delete entry;
            entry = next;
        }
        head = nullptr;
        tail = nullptr;
    }

    // What readers and consumers work with. The condition is null when the list was made without one.
    ListEntry<T>* getHead() const { return head; }
    pthread_mutex_t* getMutex() { return &mutex_; }
    pthread_cond_t* getCondition() { return hasCondition_ ? &condition_ : nullptr; }

    ListEntry<T>* head;  // both null when the list is empty
    ListEntry<T>* tail;

private:
    pthread_mutex_t mutex_;
    pthread_mutexattr_t mutexAttributes_;
    pthread_cond_t condition_;  // there when hasCondition_
    bool hasCondition_;
    [[maybe_unused]] bool flag_;
};
