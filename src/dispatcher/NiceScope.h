#pragma once

namespace ZOVA {

/** The nice value of one call; logs nothing. */
class [[nodiscard]] NiceScope {
public:
    /** Sets the value; leaves it alone where the old one cannot be read. */
    explicit NiceScope(int priority);
    NiceScope(const NiceScope&) = delete;
    NiceScope& operator=(const NiceScope&) = delete;
    ~NiceScope() { Restore(); }

    /** Gives the old value back, once. A process that has become an unprivileged user may be refused that. */
    void Restore();

private:
    int oldPriority;
    bool changed;
};

}  // namespace ZOVA
