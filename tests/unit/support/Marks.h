#pragma once

#include <string>

/** What the test libraries tell the test program that opened them. Null-safe without a fake platform. */
extern "C" __attribute__((visibility("default"))) void UnitMark(const char* what);

/** The fake process's current hat, as the libraries' probe sees it. */
extern "C" __attribute__((visibility("default"))) const char* UnitHat();
