#pragma once

#include <cstdlib>
#include <string>

#include "ChildRun.h"
#include "DeviceTest.h"
#include "webapi/Json.h"

namespace unit {

/** Calls in this process, with the process compared before and after. */
class ProcessLibTest : public DeviceTest {
protected:
    ProcessLibTest() {
        unsetenv("APPARMOR_HAT_ARRAY");
        unsetenv("in_zovaapid");
    }

    static int ErrorOf(TestRunner& runner) { return runner.Response()->GetError(); }
    static Json::Value DataOf(TestRunner& runner) { return Json::member(runner.Response()->GetBody(), "data"); }

    /** Calls the method and finds the process as it was before. */
    void CallAndFindProcessAsBefore(TestRunner& runner, const std::string& method, bool called = true) {
        const Json::Value before = Snapshot();
        EXPECT_EQ(CallGood(runner, method), called);
        const Json::Value after = Snapshot();
        for (const char* key : {"user", "group", "groups", "hat", "nice", "cin", "cout", "directory"}) {
            EXPECT_EQ(after[key], before[key]) << key;
        }
    }
};

}  // namespace unit
