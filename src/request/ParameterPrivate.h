#pragma once

namespace ZOVA {

template <class T>
struct APIParameterPrivate {
    bool set = false;
    bool reset = false;
    bool invalid = false;
    T value{};
    bool isDefault = false;
};

}  // namespace ZOVA
