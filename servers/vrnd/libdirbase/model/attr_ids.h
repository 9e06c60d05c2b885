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

// What keeps the password state.
constexpr std::int32_t attr_id_pwdchangedtime = 11;
constexpr std::int32_t attr_id_pwdaccountlockedtime = 12;
constexpr std::int32_t attr_id_pwdexpirationwarned = 13;
constexpr std::int32_t attr_id_pwdfailuretime = 14;
constexpr std::int32_t attr_id_pwdhistory = 15;
constexpr std::int32_t attr_id_pwdgraceusetime = 16;
constexpr std::int32_t attr_id_pwdreset = 17;
constexpr std::int32_t attr_id_xan_pwdaccountlocked = 25;
constexpr std::int32_t attr_id_xan_pwdgrouppolicydn = 27;
constexpr std::int32_t attr_id_xan_pwdindividualpolicydn = 28;
