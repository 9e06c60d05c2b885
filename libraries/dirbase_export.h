// What the public headers are written with: the mark of what a shared library of this system offers to its callers
// (everything else is compiled hidden), and the words by which the headers of plain functions and records read the same
// in C++20 and in C11.
//
// A header for both keeps between DIRBASE_C_BEGIN and DIRBASE_C_END to what C knows: records with a typedef of their
// name, and pointers in place of references. It includes C's own headers and has the rest, if any, under #ifdef
// __cplusplus. The layout of a record and the way to call a function are one for both languages.
#pragma once

// The headers name the types of these as C does. In C++ they stand in std as well, where callers look for them.
#ifdef __cplusplus
#include <cstddef>
#include <cstdint>
#endif

#define DIRBASE_EXPORT __attribute__((visibility("default")))

// Marks a private member of an exported class that only the library's own sources call.
#define DIRBASE_HIDDEN __attribute__((visibility("hidden")))

// DIRBASE_C_BEGIN, DIRBASE_C_END   stand around what has the linkage of C
// DIRBASE_ENUM_INT                 behind the name of an enum: its values are held in 32 bits, as an int; in C the
//                                  compiler may take unsigned
// DIRBASE_NUMBER                   a constant in the range of an int. In C, too, it may be a case label or the size of
//                                  an array; its type there is int
// DIRBASE_CONSTANT                 any other constant; in C it is a variable
// DIRBASE_DEFAULT                  behind a parameter or a member: its value where C++ leaves it out. C gives them all
#ifdef __cplusplus
#define DIRBASE_C_BEGIN extern "C" {
#define DIRBASE_C_END }
#define DIRBASE_ENUM_INT : int
#define DIRBASE_NUMBER(type, name, value) constexpr type name = value
#define DIRBASE_CONSTANT(type, name, value) constexpr type name = value
#define DIRBASE_DEFAULT(value) = value
#else
#define DIRBASE_C_BEGIN
#define DIRBASE_C_END
#define DIRBASE_ENUM_INT
#define DIRBASE_NUMBER(type, name, value) enum { name = value }
#define DIRBASE_CONSTANT(type, name, value) static const type name = value
#define DIRBASE_DEFAULT(value)
#endif
