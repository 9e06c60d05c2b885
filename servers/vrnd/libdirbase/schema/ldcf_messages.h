// The ids and recurring words of the schema engine's messages.
//
// The ids are the catalogue's. A positive id is a fault at a place in schema text and a negative one a fault between
// definitions, which name each other; ids given with a catalogue number belong to results that go to an LDAP client.
#pragma once

enum ldcf_message_id : int {
    LDCF_MSG_EXPECTED = 1,
    LDCF_MSG_EXPECTED_ONE_OF = 2,
    LDCF_MSG_EXPECTED_DIGIT = 3,
    LDCF_MSG_EMPTY_QUOTES = 4,
    LDCF_MSG_EXPECTED_NUMBER = 5,
    LDCF_MSG_EXPECTED_BRACE = 6,
    LDCF_MSG_EXPECTED_QDSTRING = 7,
    LDCF_MSG_EXPECTED_QDSTRINGS = 8,
    LDCF_MSG_EXPECTED_DESCR = 9,
    LDCF_MSG_EXPECTED_QDESCR = 10,
    LDCF_MSG_EXPECTED_QDESCRS = 11,
    LDCF_MSG_OPEN_QUOTE = 12,
    LDCF_MSG_END_OF_INPUT = 13,
    LDCF_MSG_INVALID_TOKEN = 14,
    LDCF_MSG_EXPECTED_USAGE = 15,
    LDCF_MSG_EXPECTED_DBNAME = 16,
    LDCF_MSG_EXPECTED_ACCESS_CLASS = 17,
    LDCF_MSG_ALREADY_DEFINED = 18,
    LDCF_MSG_DUPLICATE = 19,
    LDCF_MSG_EXTENDED_TWICE = 20,
    LDCF_MSG_ALTERNATE_ELSEWHERE = 21,
    LDCF_MSG_ALTERNATE_DIFFERS = 22,
    LDCF_MSG_RULE_WITHOUT_SYNTAX = 23,
    LDCF_MSG_EXPECTED_ENCRYPT = 41,
    LDCF_MSG_EXPECTED_RETURN_VALUE = 42,

    LDCF_MSG_INVALID_OPERATION = -24,
    LDCF_MSG_NOT_FOUND = -25,
    LDCF_MSG_NO_SYNTAX = -28,
    LDCF_MSG_DELETE_TWO_BODIES = -29,
    LDCF_MSG_REPLACE_TWO_BODIES = -30,
    LDCF_MSG_IN_USE = -32,
    LDCF_MSG_NO_STANDARD_DEFINITION = -33,
    LDCF_MSG_USAGE_DIFFERS = -34,
    LDCF_MSG_ATTRIBUTE_CYCLE = -35,
    LDCF_MSG_CLASS_CYCLE = -36,
    LDCF_MSG_REQUIRED_MISSING = -37,
    LDCF_MSG_REQUIRED_DIFFERS = -38,
    LDCF_MSG_REQUIRED_INHERITED_DIFFERS = -39,
    LDCF_MSG_REQUIRED_EXTENSION_DIFFERS = -40,
    LDCF_MSG_ENCRYPTED_SYNTAX = -43,
    LDCF_MSG_ENCRYPTED_SPECIAL = -44,
    LDCF_MSG_ENCRYPTED_PASSWORD = -47,

    LDCF_MSG_ALREADY_EXISTS = static_cast<int>(0xbffbffe1),     // 31 of catalogue 4
    LDCF_MSG_DELETE_NOT_THERE = static_cast<int>(0xbffbffe6),   // 26 of catalogue 4
    LDCF_MSG_REPLACE_NOT_THERE = static_cast<int>(0xbffbffe5),  // 27 of catalogue 4

    // Written with PrintMessage, not raised.
    LDCF_MSG_PROTECTION_CHANGED = 45,
    LDCF_MSG_RULE_INVALID = 46,
    LDCF_MSG_RULE_INCONSISTENT = 49,
};

// Where a text shows the source around the fault (ldcf_token_factory::throw_exc puts the excerpt in front).
#define LDCF_SPOT "[v[=v=VAR=v=]v]"
#define LDCF_NOT_FOUND_AT ", but could not find it at or before " LDCF_SPOT
#define LDCF_EXPECTED(item) "expected [p[" item "]p]" LDCF_NOT_FOUND_AT
#define LDCF_EXPECTED_ONE_OF(list) "expected one of the following: [p[" list "]p]" LDCF_NOT_FOUND_AT

// The kind words.
#define LDCF_KIND_SYNTAX "syntax"
#define LDCF_KIND_MATCHING_RULE "matching rule"
#define LDCF_KIND_ATTRIBUTE_TYPE "attribute type"
#define LDCF_KIND_OBJECT_CLASS "object class"
