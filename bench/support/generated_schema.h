// A schema of any size, alike in its proportions to those that are in use: what grows with the number of definitions is
// measured on it.
//
// The same arguments always give the same text. The syntaxes and matching rules are the shipped ones; attribute types
// and classes are made up. Of the attribute types a third has a supertype (chains of up to four), a third two names,
// and all whose name is too long for a column, with some others, an extended definition. A class has a superclass at
// most three below `top`, now and then two, and 10 to 20 attribute types of its own.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace bench_support {

struct schema_size {
    std::size_t attribute_types;
    std::size_t classes;

    std::size_t definitions() const { return attribute_types + classes; }
};

constexpr schema_size large_schema{20'000, 5'000};
constexpr schema_size tenth_of_large_schema{2'000, 500};

struct schema_text {
    std::string file;  // without a folder
    std::string text;
};

// The files of a schema in the order in which they are loaded; the last one, which takes additions, is empty. The
// definitions are spread over files of 2,000 attribute types or 500 classes, so a change rewrites few of them.
std::vector<schema_text> generate_schema(schema_size size);

// The primary name of the attribute type with an index below 27,000.
std::string generated_attribute_name(std::size_t index);

// One standard definition of an attribute type that no generated schema holds, with a supertype that all hold.
extern const char* const additional_attribute;

// The shipped schema's files, one behind the other.
std::string shipped_schema_text();

// Puts a relational back end on the list of back ends, without which no attribute type gets a table.
void provide_backend();

// Makes the shipped schema the active one, with the name cache filled, unless an active schema is there. Benchmarks
// that need another one empty it first, and leave it empty.
void require_shipped_schema();

// Reads all texts into an empty schema; nothing is linked.
void parse_all(ldcf_schema& schema, const std::vector<schema_text>& texts);

}  // namespace bench_support
