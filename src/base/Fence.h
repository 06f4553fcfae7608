#pragma once

#include <exception>
#include <optional>
#include <string>

#include "base/Printable.h"

namespace ZOVA::base {

/** Calls foreign code, which no exception leaves. @return what it threw, as printable text; nothing if it returned. */
template <class Function>
std::optional<std::string> ThrownBy(const Function& foreign) {
    try {
        foreign();
        return std::nullopt;
    } catch (const std::exception& exception) {
        return Printable(exception.what());
    } catch (...) {
        return "not a std::exception";
    }
}

}  // namespace ZOVA::base
