#include "WebCall.h"

#include <cstdlib>

#include "FrameworkTest.h"
#include "TestRunner.h"
#include "webapi/Json.h"

namespace unit {

namespace {

Json::Value ProcessEnvironment() {
    Json::Value variables(Json::objectValue);
    for (const auto& [name, value] : EnvironmentMap()) {
        variables[name] = value;
    }
    return variables;
}

void ParseOutput(const std::string& output, WebAnswer& answer) {
    std::size_t begin = 0;
    for (std::size_t end = output.find("\r\n"); end != std::string::npos; end = output.find("\r\n", begin)) {
        const std::string line = output.substr(begin, end - begin);
        begin = end + 2;
        if (line.empty()) {
            answer.bodyText = output.substr(begin);
            answer.wellFormed =
                !answer.headers.empty() && Json::fromString(answer.body, answer.bodyText) && answer.body.isObject();
            return;
        }
        answer.headers.push_back(line);
    }
}

/** The child's side: environment, call, report. */
class Served {
public:
    Served(const WebCall& webCall, const std::function<void(fake::FakePlatform&)>& prepareCall)
        : call(webCall), prepare(prepareCall) {}

    Json::Value Run() {
        fake::FakePlatform& platform = *fake::FakePlatform::Active();
        {
            const fake::Suspended suspended;
            clearenv();
            for (const auto& [name, value] : call.environment) {
                setenv(name.c_str(), value.c_str(), 1);
            }
        }
        if (prepare) {
            prepare(platform);
        }
        Json::Value report(Json::objectValue);
        report["before"] = Snapshot();
        platform.calls.clear();
        {
            TestWebEntry entry;
            entry.Run(Json::Value());
            // As text: with what surrounds it here, a deep value would be nested deeper than is read.
            report["request"] = Json::toString(entry.Request()->Serialize());
        }
        report["calls"] = CallsToJson();
        report["after"] = Snapshot();
        report["environment"] = ProcessEnvironment();
        report["failedCall"] = platform.FailedCall();
        report["failedIndex"] = static_cast<int>(platform.FailedIndex());
        return report;
    }

private:
    const WebCall& call;
    const std::function<void(fake::FakePlatform&)>& prepare;
};

}  // namespace

WebCall WebCall::Get(const std::string& query) {
    return {{{"REQUEST_METHOD", "GET"}, {"QUERY_STRING", query}}, ""};
}

WebCall WebCall::Post(const std::string& body) {
    return {{{"REQUEST_METHOD", "POST"},
             {"CONTENT_TYPE", "application/x-www-form-urlencoded"},
             {"CONTENT_LENGTH", std::to_string(body.size())}},
            body};
}

WebCall WebCall::With(const std::string& name, const std::string& value) const {
    WebCall changed = *this;
    changed.environment[name] = value;
    return changed;
}

bool WebAnswer::HasHeader(const std::string& line) const {
    for (const std::string& header : headers) {
        if (header == line) {
            return true;
        }
    }
    return false;
}

std::string WebAnswer::Header(const std::string& name) const {
    for (const std::string& header : headers) {
        if (header.compare(0, name.size() + 2, name + ": ") == 0) {
            return header.substr(name.size() + 2);
        }
    }
    return "";
}

std::vector<std::string> WebAnswer::CallsOf(const std::string& name) const {
    std::vector<std::string> texts;
    for (const std::string& text : calls) {
        if (text.compare(0, name.size() + 1, name + "(") == 0) {
            texts.push_back(text);
        }
    }
    return texts;
}

int WebAnswer::ErrorCode() const {
    return Json::asInt(Json::member(Json::member(body, "error"), "code"));
}

WebAnswer Serve(const WebCall& call, const std::function<void(fake::FakePlatform&)>& prepare) {
    Served served(call, prepare);
    WebAnswer answer;
    answer.child = RunInChild(call.body, [&] { return served.Run(); });
    const Json::Value& report = answer.child.report;
    answer.before = Json::member(report, "before");
    answer.after = Json::member(report, "after");
    Json::fromString(answer.request, Json::asString(Json::member(report, "request")));
    answer.environment = Json::member(report, "environment");
    answer.log = answer.child.log;
    answer.failedCall = Json::asString(Json::member(report, "failedCall"));
    answer.failedIndex = Json::asInt(Json::member(report, "failedIndex"));
    for (const Json::Value& text : Json::member(report, "calls")) {
        answer.calls.push_back(Json::asString(text));
    }
    ParseOutput(answer.child.output, answer);
    return answer;
}

}  // namespace unit
