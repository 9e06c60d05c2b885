// A guard for filters, until they are handed over by release().
#pragma once

#include <memory>

#include "servers/vrnd/libdirbase/model/filter.h"

struct free_filter {
    void operator()(Filter* filter) const noexcept { filter_free(filter); }
};
using filter_guard = std::unique_ptr<Filter, free_filter>;

// A list under construction: filters joined by f_next, in their order. It releases what nobody takes.
class filter_list {
public:
    filter_list() = default;
    ~filter_list() { clear(); }
    filter_list(const filter_list&) = delete;
    filter_list& operator=(const filter_list&) = delete;

    bool empty() const { return first_ == nullptr; }
    void append(filter_guard filter)
    {
        Filter* const added = filter.release();
        *end_ = added;
        end_ = &added->f_next;
    }
    void clear()
    {
        for (Filter* filter = release(); filter != nullptr;) {
            Filter* const next = filter->f_next;
            filter_free(filter);
            filter = next;
        }
    }
    Filter* release()
    {
        Filter* const first = first_;
        first_ = nullptr;
        end_ = &first_;
        return first;
    }

private:
    Filter* first_ = nullptr;
    Filter** end_ = &first_;
};
