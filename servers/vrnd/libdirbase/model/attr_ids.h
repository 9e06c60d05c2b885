// Numbers of the attributes that this folder treats by themselves (attr_id of asyntaxinfo).
#pragma once

#include <cstdint>

constexpr std::int32_t attr_id_member = 0;
constexpr std::int32_t attr_id_uniquemember = 1;
constexpr std::int32_t attr_id_objectclass = -6;
constexpr std::int32_t attr_id_allmembers = -7;
constexpr std::int32_t attr_id_aclsource = -9;
constexpr std::int32_t attr_id_ownersource = -10;
constexpr std::int32_t attr_id_ref = -15;
