// What an action raises, as a text that tests can compare.
#pragma once

#include <string>
#include <typeinfo>

#include "servers/vrnd/libcsgl/csgl_exception.h"

// "class: text", with the code behind the class where it is the raiser's: "exc_unmapped_t 4: text". Empty for nothing.
std::string raised(const auto& action)
{
    try {
        action();
    } catch (const exc_t& e) {
        std::string name = typeid(e).name();
        name.erase(0, name.find("exc_"));
        return name + (name == "exc_unmapped_t" ? " " + std::to_string(e.code()) : "") + ": " + e.message().text();
    }
    return "";
}
