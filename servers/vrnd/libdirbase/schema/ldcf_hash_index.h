// The way by which look-ups find their node in the name cache.
//
// The hash of ELF symbol tables, which gives a name its slot, takes each character after the last, and the fixed slots
// begin to chain in a large schema. So beside the slots stands a table of wide hashes, made of eight bytes at a time,
// each with the first node of its key. A look-up that hits costs little more than reading the name.
//
// Private to this folder; the rules are those of ldcf_hash.h.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

using ldcf_key_word = std::uint64_t;

// Upper case for the letters, and "[" to "_" for the few bytes behind them; bytes from 0x80 up are negative and stay.
inline char ldcf_fold_key(char c)
{
    const auto byte = static_cast<signed char>(c);
    return static_cast<char>(byte > 0x60 ? byte - 0x20 : byte);
}

// The same for eight bytes. The sum carries into the top bit of each byte above 0x60.
inline ldcf_key_word ldcf_fold_key(ldcf_key_word text)
{
    constexpr ldcf_key_word every = 0x0101010101010101;
    const ldcf_key_word above = ((text & every * 0x7f) + every * (0x80 - 0x61)) & ~text & every * 0x80;
    return text ^ (above >> 2);
}

// A name as it is sought: its first and its last eight bytes, which overlap in a name of less than sixteen and say all
// of it, and its hash, which is spread best over the high bits.
class ldcf_sought_name {
public:
    ldcf_sought_name(const char* text, std::size_t length) : text_(text), length_(length)
    {
        constexpr ldcf_key_word factors[] = {0x9e3779b97f4a7c15, 0xc2b2ae3d27d4eb4f, 0x165667b19e3779f9};
        if (length_ >= word_size) {
            first_ = load<ldcf_key_word>(text_);
            last_ = load<ldcf_key_word>(text_ + length_ - word_size);
        } else {
            first_ = last_ = load_short(text_, length_);
        }
        hash_ = one_case(first_) * factors[0] + one_case(last_) * factors[1] + length_ * factors[2];
        for (std::size_t at = word_size; at + word_size < length_; at += word_size) {
            hash_ = (hash_ + one_case(load<ldcf_key_word>(text_ + at))) * factors[0];
        }
    }

    ldcf_key_word hash() const { return hash_; }

    bool is_key_of(const ldcf_hash_tbl_entry& node) const
    {
        const char* key = reinterpret_cast<const char*>(&node + 1);
        if (static_cast<std::size_t>(node.length) != length_) {
            return false;
        }
        if (length_ < word_size) {
            return load_short(key, length_) == ldcf_fold_key(first_);
        }
        if (load<ldcf_key_word>(key) != ldcf_fold_key(first_) ||
            load<ldcf_key_word>(key + length_ - word_size) != ldcf_fold_key(last_)) {
            return false;
        }
        for (std::size_t at = word_size; at + word_size < length_; at += word_size) {
            if (load<ldcf_key_word>(key + at) != ldcf_fold_key(load<ldcf_key_word>(text_ + at))) {
                return false;
            }
        }
        return true;
    }

private:
    static constexpr std::size_t word_size = sizeof(ldcf_key_word);

    template <typename Part>
    static ldcf_key_word load(const char* text)
    {
        Part part;
        std::memcpy(&part, text, sizeof part);
        return part;
    }

    // Up to seven bytes: two parts that may overlap, so texts of one length differ in it when they differ at all.
    static ldcf_key_word load_short(const char* text, std::size_t length)
    {
        if (length >= 4) {
            return load<std::uint32_t>(text) | load<std::uint32_t>(text + length - 4) << 32;
        }
        if (length >= 2) {
            return load<std::uint16_t>(text) | load<std::uint16_t>(text + length - 2) << 32;
        }
        return length == 0 ? 0 : load<std::uint8_t>(text);
    }

    // Takes away what a folding may change, and more: enough to hash by.
    static ldcf_key_word one_case(ldcf_key_word text) { return text & 0xdfdfdfdfdfdfdfdf; }

    const char* text_;
    std::size_t length_;
    ldcf_key_word first_;
    ldcf_key_word last_;
    ldcf_key_word hash_;
};

// The table: at least half of its places are empty, and a key is looked for from the place of its hash on. A node's key
// stands right behind it in memory.
class ldcf_node_index {
public:
    const ldcf_hash_tbl_entry* find(const ldcf_sought_name& name) const
    {
        return places_ == nullptr ? nullptr : place_of(name).node;
    }

    // Lets a key lead to this node. False when memory ran out, with nothing changed.
    bool put(ldcf_hash_tbl_entry* node);

    void clear();

private:
    struct place {
        ldcf_key_word hash;
        ldcf_hash_tbl_entry* node;  // null in an empty place
    };

    std::size_t start_of(ldcf_key_word hash) const { return hash >> shift_; }
    std::size_t next(std::size_t at) const { return (at + 1) & mask_; }

    // The place of a key, or the empty one where it would go.
    place& place_of(const ldcf_sought_name& name) const
    {
        std::size_t at = start_of(name.hash());
        while (places_[at].node != nullptr && (places_[at].hash != name.hash() || !name.is_key_of(*places_[at].node))) {
            at = next(at);
        }
        return places_[at];
    }

    bool grow();

    place* places_ = nullptr;
    unsigned shift_ = 0;    // 64 less the bits of the number of places
    std::size_t mask_ = 0;  // the number of places less one
    std::size_t used_ = 0;
};

extern ldcf_node_index ldcf_nodes_by_key;

// ldcf_hash_get for a name whose length is known.
inline const ldcf_hash_tbl_entry* ldcf_find_node(const char* name, std::size_t length)
{
    return length > ldcf_hash_longest_key ? nullptr : ldcf_nodes_by_key.find(ldcf_sought_name(name, length));
}
