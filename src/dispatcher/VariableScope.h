#pragma once

#include <optional>
#include <string>

namespace ZOVA {

/** A variable of the process environment. */
class [[nodiscard]] VariableScope {
public:
    /** Notes the variable, which may be unset. `name` has to outlive the object. */
    explicit VariableScope(const char* name);
    VariableScope(const VariableScope&) = delete;
    VariableScope& operator=(const VariableScope&) = delete;
    ~VariableScope();

private:
    const char* name;
    std::optional<std::string> saved;
};

}  // namespace ZOVA
