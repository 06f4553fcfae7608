// A description file of any content: what is accepted of it, what is made of it, and how calls are admitted by it.

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <vector>

#include "Check.h"
#include "Target.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace {

constexpr const char* kApi = "Fuzz.Case";
constexpr const char* kFile = "Fuzz.Case.lib";
constexpr size_t kMostApis = 8;
constexpr size_t kMostMethods = 16;
constexpr const char* kAttributes[] = {"allowUpload", "allowDownload",  "allowDemo",   "allowTimeout", "disableSocket",
                                       "grantable",   "grantByDefault", "grantByUser", "skipCheckIP",  ""};

/** What lib.def holds on a device. */
constexpr const char* kDefaults =
    R"({"authLevel":1,"allowUser":["admin.local"],"priority":0,"methods":{"allowUpload":false,"allowDemo":false}})";

/** A runner with the usual defaults, whatever the machine has. */
class Runner : public ZOVA::APIRunner {
public:
    Runner() { FUZZ_CHECK(Json::fromString(libDefault, kDefaults)); }
};

/** A working directory that holds the one description file, for as long as the process runs. */
class DescriptionFolder {
public:
    DescriptionFolder() {
        FUZZ_CHECK(mkdtemp(path) != nullptr);
        old = open(".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
        FUZZ_CHECK(old >= 0);
    }
    DescriptionFolder(const DescriptionFolder&) = delete;
    DescriptionFolder& operator=(const DescriptionFolder&) = delete;

    ~DescriptionFolder() {
        unlink((std::string(path) + "/" + kFile).c_str());
        rmdir(path);
        close(old);
    }

    void Enter() { FUZZ_CHECK(chdir(path) == 0); }
    void Leave() { FUZZ_CHECK(fchdir(old) == 0); }

private:
    char path[32] = "/tmp/webapi-fuzz-XXXXXX";
    int old;
};

void WriteDescription(const std::string& text) {
    FILE* file = fopen(kFile, "wbe");
    FUZZ_CHECK(file != nullptr);
    FUZZ_CHECK(fwrite(text.data(), 1, text.size(), file) == text.size());
    FUZZ_CHECK(fclose(file) == 0);
}

void CheckDescriptions(ZOVA::APIRunner& runner, Json::Value& descriptions) {
    for (Json::Value& description : descriptions) {
        FUZZ_CHECK(runner.CheckLibDescription(description));
        FUZZ_CHECK(Json::member(description, "lib").isString());
        for (const char* key : {"authLevel", "allowUser", "requestFormat", "priority"}) {
            FUZZ_CHECK(Json::hasMember(description, key));
        }
    }
}

/** Method names of any version, as admission would take them, and one that is none. */
std::vector<std::string> MethodsOf(const Json::Value& description) {
    std::vector<std::string> names{"no such method"};
    for (const Json::Value& entries : Json::member(description, "methods")) {
        if (entries.type() != Json::arrayValue) {
            continue;
        }
        for (const Json::Value& entry : entries) {
            if (names.size() < kMostMethods && entry.isString()) {
                names.push_back(Json::asString(entry));
            } else if (names.size() < kMostMethods && entry.type() == Json::objectValue && !entry.empty()) {
                names.push_back(entry.begin().name());
            }
        }
    }
    return names;
}

bool IsRefusal(int error) {
    return (error >= 101 && error <= 104) || error == 115 || error == 116;
}

void Admit(ZOVA::APIRunner& runner, const std::string& api, int version, const std::string& method, bool upload) {
    Json::Value init(Json::objectValue);
    init["getParam"]["api"] = api;
    init["getParam"]["version"] = version;
    init["getParam"]["method"] = method;
    init["environ"]["CONTENT_TYPE"] = upload ? "multipart/form-data; boundary=x" : "text/plain";
    ZOVA::APIRequest request(init);
    ZOVA::APIResponse response(&request);
    if (runner.CheckRequestParam(&request, &response)) {
        FUZZ_CHECK(version >= 1 && !api.empty() && !method.empty());
        FUZZ_CHECK(runner.AddAPIInfo(&request));
        FUZZ_CHECK(request.GetAPIInfo("lib", Json::Value()).isString());
        request.GetAllowUser();
    } else {
        FUZZ_CHECK(IsRefusal(response.GetError()));
    }
    for (const char* attribute : kAttributes) {
        FUZZ_CHECK(runner.GetMethodAttr(&request, attribute) ==
                   (*attribute != '\0' && runner.GetMethodAttr(api, version, method, attribute)));
    }
}

void AdmitAll(ZOVA::APIRunner& runner, const Json::Value& descriptions) {
    size_t apis = 0;
    for (auto description = descriptions.begin(); description != descriptions.end() && apis < kMostApis;
         ++description, ++apis) {
        const int lowest = Json::asInt(Json::member(*description, "minVersion"));
        const int highest = Json::asInt(Json::member(*description, "maxVersion"));
        for (const std::string& method : MethodsOf(*description)) {
            for (const int version : {0, 1, lowest, highest}) {
                Admit(runner, description.name(), version, method, false);
                Admit(runner, description.name(), version, method, true);
            }
        }
    }
}

void Run(const std::string& text) {
    WriteDescription(text);
    Runner runner;
    Json::Value descriptions(Json::objectValue);
    const bool read = runner.InitLibDesc(descriptions, kApi);
    Json::Value content;
    FUZZ_CHECK(!read || Json::fromString(content, text));
    CheckDescriptions(runner, descriptions);
    // The runner's own cache has the file's APIs from the first of these calls on.
    Admit(runner, kApi, 1, "get", false);
    AdmitAll(runner, descriptions);
    Json::Value all(Json::objectValue);
    FUZZ_CHECK(runner.InitLibDesc(all) && all == descriptions);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static DescriptionFolder folder;
    folder.Enter();
    Run(fuzz::TextOf(data, size));
    folder.Leave();
    return 0;
}
