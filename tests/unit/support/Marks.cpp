#include "Marks.h"

#include "FakePlatform.h"

void UnitMark(const char* what) {
    if (fake::FakePlatform* platform = fake::FakePlatform::Active()) {
        platform->Enter("mark", what, 0);
    }
}

const char* UnitHat() {
    const fake::FakePlatform* platform = fake::FakePlatform::Active();
    return platform == nullptr ? "" : platform->process.hat.c_str();
}
