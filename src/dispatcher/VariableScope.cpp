#include "dispatcher/VariableScope.h"

#include <cstdlib>

namespace ZOVA {

VariableScope::VariableScope(const char* variable) : name(variable) {
    if (const char* value = getenv(name)) {
        saved = value;
    }
}

VariableScope::~VariableScope() {
    if (saved) {
        setenv(name, saved->c_str(), 1);
    } else {
        unsetenv(name);
    }
}

}  // namespace ZOVA
