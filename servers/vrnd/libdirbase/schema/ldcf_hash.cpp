// The name cache: see ldcf_hash.h, and ldcf_hash_index.h for the way of a look-up.
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <memory>
#include <new>
#include <utility>

#include "servers/vrnd/libdirbase/schema/ldcf_hash_index.h"

constinit ldcf_node_index ldcf_nodes_by_key;

namespace {

ldcf_hash_tbl_entry* slots[ldcf_hash_slots];

constexpr unsigned first_index_bits = 10;

// Memory for nodes with their keys, taken in large pieces and given back all at once. Each node begins a cache line, so
// that with a key of usual length it fills one and no more.
class node_memory {
public:
    // Null when memory ran out.
    void* take(std::size_t size)
    {
        size = (size + line - 1) / line * line;
        if (newest_ == nullptr || newest_->used + size > piece_size) {
            void* block = std::aligned_alloc(line, piece_size);
            if (block == nullptr) {
                return nullptr;
            }
            newest_ = new (block) piece{newest_, line};
        }
        return reinterpret_cast<char*>(newest_) + std::exchange(newest_->used, newest_->used + size);
    }

    bool empty() const { return newest_ == nullptr; }

    void give_back()
    {
        while (newest_ != nullptr) {
            std::free(std::exchange(newest_, newest_->before));
        }
    }

private:
    static constexpr std::size_t line = 64;
    static constexpr std::size_t piece_size = std::size_t{64} * 1024;

    struct piece {
        piece* before;
        std::size_t used;  // bytes, this record's line included
    };
    static_assert(sizeof(piece) <= line);
    static_assert(line + sizeof(ldcf_hash_tbl_entry) + ldcf_hash_longest_key + line < piece_size);

    piece* newest_ = nullptr;
};

constinit node_memory memory_of_nodes;

struct close_file {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

}  // namespace

// ---- the index ------------------------------------------------------------------------------------------------------

bool ldcf_node_index::put(ldcf_hash_tbl_entry* node)
{
    if (2 * (used_ + 1) > mask_ && !grow()) {
        return false;
    }
    const ldcf_sought_name name(node->name, static_cast<std::size_t>(node->length));
    place& found = place_of(name);
    used_ += found.node == nullptr ? 1 : 0;
    found = {name.hash(), node};
    return true;
}

bool ldcf_node_index::grow()
{
    ldcf_node_index larger;
    larger.mask_ = places_ == nullptr ? (std::size_t{1} << first_index_bits) - 1 : 2 * mask_ + 1;
    larger.shift_ = places_ == nullptr ? 64 - first_index_bits : shift_ - 1;
    larger.used_ = used_;
    larger.places_ = static_cast<place*>(std::calloc(larger.mask_ + 1, sizeof(place)));
    if (larger.places_ == nullptr) {
        return false;
    }
    for (std::size_t i = 0; places_ != nullptr && i <= mask_; ++i) {
        if (places_[i].node != nullptr) {
            std::size_t at = larger.start_of(places_[i].hash);
            while (larger.places_[at].node != nullptr) {
                at = larger.next(at);
            }
            larger.places_[at] = places_[i];
        }
    }
    std::free(places_);
    *this = larger;
    return true;
}

void ldcf_node_index::clear()
{
    std::free(places_);
    *this = ldcf_node_index();
}

// ---- the cache ------------------------------------------------------------------------------------------------------

std::uint32_t ldcf_hash_name(const char* key)
{
    std::uint32_t hash = 0;
    for (; *key != '\0'; ++key) {
        hash = hash * 16 + static_cast<std::uint32_t>(static_cast<std::int32_t>(static_cast<signed char>(*key)));
        const std::uint32_t high = hash & 0xf0000000u;
        hash = (hash ^ high >> 24) & ~high;
    }
    return hash % ldcf_hash_slots;
}

const ldcf_hash_tbl_entry* ldcf_hash_get(const char* name)
{
    return name == nullptr ? nullptr : ldcf_find_node(name, std::strlen(name));
}

void ldcf_hash_put(const char* name, asyntaxinfo* info)
{
    const std::size_t length = name == nullptr ? 0 : std::strlen(name);
    if (name == nullptr || length > ldcf_hash_longest_key) {
        return;
    }
    void* block = memory_of_nodes.take(sizeof(ldcf_hash_tbl_entry) + length + 1);
    if (block == nullptr) {
        return;
    }
    char* key = static_cast<char*>(block) + sizeof(ldcf_hash_tbl_entry);
    for (std::size_t i = 0; i <= length; ++i) {
        key[i] = ldcf_fold_key(name[i]);
    }
    ldcf_hash_tbl_entry*& head = slots[ldcf_hash_name(key)];
    auto* node = new (block) ldcf_hash_tbl_entry{key, info, static_cast<std::int32_t>(length), head};
    if (ldcf_nodes_by_key.put(node)) {  // else the node lies idle until the next flush
        head = node;
    }
}

void ldcf_hash_flush(void)
{
    if (memory_of_nodes.empty()) {
        return;  // most often: every record that is dropped empties the cache
    }
    std::fill(std::begin(slots), std::end(slots), nullptr);
    ldcf_nodes_by_key.clear();
    memory_of_nodes.give_back();
}

void ldcf_debug_hash_tbl(const char* filename)
{
    const std::unique_ptr<std::FILE, close_file> file(filename == nullptr ? nullptr : std::fopen(filename, "w"));
    if (file == nullptr) {
        return;
    }
    int used = 0;
    int elements = 0;
    std::fprintf(file.get(), "\tDump of Schema Hash Cache\n");
    for (std::size_t i = 0; i < ldcf_hash_slots; ++i) {
        std::fprintf(file.get(), "hashTable[ %d ] = ", static_cast<int>(i));
        used += slots[i] != nullptr ? 1 : 0;
        for (const ldcf_hash_tbl_entry* node = slots[i]; node != nullptr; node = node->next) {
            std::fprintf(file.get(), "( %s ) ->", node->name);
            ++elements;
        }
        std::fprintf(file.get(), "NULL\n");
    }
    std::fprintf(file.get(), "\nHash table size:\t\t%d\n", static_cast<int>(ldcf_hash_slots));
    std::fprintf(file.get(), "Hash table positions used:\t%d\n", used);
    std::fprintf(file.get(), "Number of elements:\t\t%d\n", elements);
}
