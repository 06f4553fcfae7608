#pragma once

#include <string>

#include "FrameworkTest.h"
#include "TestRunner.h"

namespace unit {

/** Path of one of the test libraries. */
std::string LibraryPath(const std::string& name);

/**
 * A device with a handful of users, sessions and described APIs:
 * - "ZOVA.Test.Good" (versions 1 and 2) in "good.so" runs as "service" with nice value 5, reversibly unless a method's
 *   attributes say otherwise, and asks for no login;
 * - the others are named after their libraries.
 */
class DeviceTest : public FrameworkTest {
protected:
    DeviceTest();

    /** Writes `descriptions` into the description file. A runner that has read it before does not look again. */
    void Install();

    /** Makes the runner's request name a call, with further parameters. */
    static void Name(TestRunner& runner, const std::string& api, int version, const std::string& method,
                     const Json::Value& params = Json::Value());
    /** Names the call and processes it. */
    static bool Call(TestRunner& runner, const std::string& api, int version, const std::string& method,
                     const Json::Value& params = Json::Value());
    /** The same for version 1 of "ZOVA.Test.Good". */
    static bool CallGood(TestRunner& runner, const std::string& method);

    /** What a grantable change to "service" and back logs, from root. */
    void ExpectServiceTraces();

    Json::Value& Good() { return descriptions["ZOVA.Test.Good"]; }

    /** Members of the description file "ZOVA.Test.lib". */
    Json::Value descriptions;
};

}  // namespace unit
