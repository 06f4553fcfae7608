#pragma once

#include <string>
#include <vector>

#include "DeviceTest.h"
#include "Hooks.h"

namespace unit {

/**
 * The device with "ZOVA.Test.Hook", whose methods "local" and "by_default" give their identity back and whose others do
 * not, and with the reserved API of batches. A test that hangs is ended by a signal.
 */
class SubrequestTest : public DeviceTest {
protected:
    SubrequestTest();
    ~SubrequestTest() override;

    /** An entry for a method of "ZOVA.Test.Hook". */
    static Json::Value Entry(const std::string& method, const std::string& what,
                             const Json::Value& more = Json::Value());

    /** Runs a batch of these entries, with further parameters; gives the response's body. */
    Json::Value Batch(const Json::Value& compound, const Json::Value& more = Json::Value());
    Json::Value Parallel(const Json::Value& compound) { return Batch(compound, J(R"({"mode": "parallel"})")); }
    /** "success" and the error codes of a batch's results; "null" for a slot that nobody filled. */
    static std::vector<std::string> Outcomes(const Json::Value& body);

    Json::Value& HookAPI() { return descriptions["ZOVA.Test.Hook"]; }

    TestRunner runner;
};

/** JSON array of these. */
template <class... Values>
Json::Value List(const Values&... values) {
    Json::Value list(Json::arrayValue);
    (list.append(values), ...);
    return list;
}

/** Numbers of this process's open descriptors. */
std::vector<int> OpenDescriptorNumbers();

}  // namespace unit
