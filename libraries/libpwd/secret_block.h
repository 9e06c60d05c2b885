// A block of memory for what nobody should find later: it is wiped before it is released. For libpwd itself.
#pragma once

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>

class secret_block {
public:
    secret_block() = default;

    // Zeroed. Tests false when memory ran out; a block of no bytes is a block.
    explicit secret_block(std::size_t size)
        : bytes_(static_cast<unsigned char*>(std::calloc(size == 0 ? 1 : size, 1)), wipe_and_free{size})
    {
    }

    explicit operator bool() const { return bytes_ != nullptr; }
    unsigned char* data() { return bytes_.get(); }
    char* text() { return reinterpret_cast<char*>(bytes_.get()); }

    // The first `size` bytes.
    std::string_view view(std::size_t size) const { return {reinterpret_cast<const char*>(bytes_.get()), size}; }

    // Hands the block over to a caller who releases it with free().
    char* release() { return reinterpret_cast<char*>(bytes_.release()); }

private:
    struct wipe_and_free {
        std::size_t size;

        void operator()(unsigned char* bytes) const
        {
            explicit_bzero(bytes, size);
            std::free(bytes);
        }
    };

    std::unique_ptr<unsigned char, wipe_and_free> bytes_;
};
