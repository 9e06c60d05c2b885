// The array of pieces that a substring filter is built with. It knows its room, so that very many pieces take no longer
// each than few.
#pragma once

#include <cstdlib>
#include <utility>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"

class substring_pieces {
public:
    substring_pieces() = default;
    ~substring_pieces() { charray_free(texts_); }
    substring_pieces(const substring_pieces&) = delete;
    substring_pieces& operator=(const substring_pieces&) = delete;

    // Takes a piece; false when memory ran out.
    bool add(heap_text piece)
    {
        if (count_ + 1 >= room_) {
            const std::size_t room = room_ == 0 ? 2 : 2 * room_;
            auto** const grown = static_cast<char**>(std::realloc(texts_, room * sizeof(char*)));
            if (grown == nullptr) {
                return false;
            }
            texts_ = grown;
            room_ = room;
        }
        texts_[count_++] = piece.release();
        texts_[count_] = nullptr;
        return true;
    }

    // The null-terminated array, which is the caller's from then on; null without pieces.
    char** release()
    {
        count_ = room_ = 0;
        return std::exchange(texts_, nullptr);
    }

private:
    char** texts_ = nullptr;
    std::size_t count_ = 0;
    std::size_t room_ = 0;  // pointers
};
