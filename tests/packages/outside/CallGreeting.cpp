// call-greeting LIBRARY: opens an API library and prints what its first method answers.

#include <dlfcn.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <iostream>

int main(int argc, char** argv) {
    void* library = argc == 2 ? dlopen(argv[1], RTLD_NOW) : nullptr;
    if (library == nullptr) {
        std::cerr << (argc == 2 ? dlerror() : "usage: call-greeting LIBRARY") << '\n';
        return 1;
    }
    using GetTable = const ZOVA::_tag_API_TABLE* (*)();
    const auto getTable = reinterpret_cast<GetTable>(dlsym(library, "GetAPITable"));
    if (getTable == nullptr) {
        std::cerr << dlerror() << '\n';
        return 1;
    }
    Json::Value init(Json::objectValue);
    init["getParam"]["name"] = "alice";
    ZOVA::APIRequest request(init);
    ZOVA::APIResponse response(&request);
    getTable()->function(&request, &response);
    std::cout << Json::toString(response.GetBody()) << '\n';
    return 0;
}
