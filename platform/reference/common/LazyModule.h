#pragma once

namespace reference {

/**
 * A shared object beside this library, opened at the first look-up and never closed. One that cannot be opened is
 * logged once and then has no symbols. Constant-initialised, so that it costs nothing at load.
 */
class LazyModule {
public:
    constexpr explicit LazyModule(const char* name) : fileName(name) {}

    /** The module's function of that name, or null. */
    template <typename Function>
    Function* Find(const char* name) {
        return reinterpret_cast<Function*>(FindSymbol(name));
    }

private:
    void* FindSymbol(const char* name);
    void Open();

    const char* fileName;
    void* handle = nullptr;
    bool tried = false;
};

}  // namespace reference
