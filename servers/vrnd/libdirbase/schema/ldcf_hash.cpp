// The name cache: see ldcf_hash.h.
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <utility>

namespace {

ldcf_hash_tbl_entry* slots[ldcf_hash_slots];

// So that emptying an empty cache, which every dropped record does, costs nothing.
std::size_t node_count = 0;

struct close_file {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

// Upper case for the letters, and "[" to "_" for the few bytes behind them.
signed char fold(char c)
{
    const auto byte = static_cast<signed char>(c);
    return static_cast<signed char>(byte > 0x60 ? byte - 0x20 : byte);
}

// The hash of ELF symbol tables, but for the top four bits, which the next character shifts out and slot_of masks away.
std::uint32_t add_to_hash(std::uint32_t hash, signed char c)
{
    hash = hash * 16 + static_cast<std::uint32_t>(static_cast<std::int32_t>(c));
    return hash ^ (hash >> 24 & 0xf0u);
}

std::uint32_t slot_of(std::uint32_t hash)
{
    return (hash & 0x0fffffffu) % ldcf_hash_slots;
}

// A name folded into a buffer of its own, with its slot.
struct folded_key {
    char text[ldcf_hash_longest_key + 1];
    std::size_t length = 0;
    std::uint32_t slot = 0;

    // False for a name that the cache doesn't handle.
    bool fold_name(const char* name)
    {
        if (name == nullptr) {
            return false;
        }
        std::uint32_t hash = 0;
        for (; name[length] != '\0'; ++length) {
            if (length == ldcf_hash_longest_key) {
                return false;
            }
            const signed char folded = fold(name[length]);
            text[length] = static_cast<char>(folded);
            hash = add_to_hash(hash, folded);
        }
        text[length] = '\0';
        slot = slot_of(hash);
        return true;
    }
};

}  // namespace

std::uint32_t ldcf_hash_name(const char* text)
{
    std::uint32_t hash = 0;
    for (; *text != '\0'; ++text) {
        hash = add_to_hash(hash, fold(*text));
    }
    return slot_of(hash);
}

const ldcf_hash_tbl_entry* ldcf_hash_get(const char* name)
{
    folded_key key;
    if (!key.fold_name(name)) {
        return nullptr;
    }
    const auto length = static_cast<std::int32_t>(key.length);
    for (const ldcf_hash_tbl_entry* node = slots[key.slot]; node != nullptr; node = node->next) {
        if (node->length == length && std::memcmp(node->name, key.text, key.length) == 0) {
            return node;
        }
    }
    return nullptr;
}

void ldcf_hash_put(const char* name, asyntaxinfo* info)
{
    folded_key key;
    if (!key.fold_name(name)) {
        return;
    }
    void* block = std::malloc(sizeof(ldcf_hash_tbl_entry) + key.length + 1);
    if (block == nullptr) {
        return;
    }
    char* text = static_cast<char*>(block) + sizeof(ldcf_hash_tbl_entry);
    std::memcpy(text, key.text, key.length + 1);
    slots[key.slot] = new (block)
        ldcf_hash_tbl_entry{text, info, static_cast<std::int32_t>(key.length), slots[key.slot]};
    ++node_count;
}

void ldcf_hash_flush(void)
{
    if (node_count == 0) {
        return;
    }
    for (ldcf_hash_tbl_entry*& head : slots) {
        while (head != nullptr) {
            std::free(std::exchange(head, head->next));
        }
    }
    node_count = 0;
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
