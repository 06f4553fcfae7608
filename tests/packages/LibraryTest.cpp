#include <dlfcn.h>
#include <gtest/gtest.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <set>
#include <string>

namespace {

using GetTable = const ZOVA::_tag_API_TABLE* (*)();

class PackageLibrary : public testing::TestWithParam<const char*> {
protected:
    static std::string Path() { return std::string(PACKAGE_LIBRARIES) + "/" + GetParam() + ".so"; }

    /** "version/method" of each method in the description file. */
    static std::set<std::string> Described() {
        std::set<std::string> methods;
        Json::Value file;
        const std::string path = std::string(PACKAGE_SOURCES) + "/" + GetParam() + "/" + GetParam() + ".lib";
        EXPECT_TRUE(Json::fromFile(file, path)) << path;
        const Json::Value& versions = Json::member(Json::member(file, GetParam()), "methods");
        for (const std::string& version : versions.getMemberNames()) {
            for (const Json::Value& entry : versions[version]) {
                methods.insert(version + "/" + (entry.isString() ? entry.asString() : entry.getMemberNames().at(0)));
            }
        }
        return methods;
    }

    static std::set<std::string> InTable(const ZOVA::_tag_API_TABLE* row) {
        std::set<std::string> methods;
        for (; row->api != nullptr; ++row) {
            EXPECT_STREQ(row->api, GetParam());
            EXPECT_NE(row->function, nullptr);
            methods.insert(std::to_string(row->version) + "/" + row->method);
        }
        return methods;
    }
};

TEST_P(PackageLibrary, OffersTheMethodsThatItsDescriptionNames) {
    void* library = dlopen(Path().c_str(), RTLD_LAZY | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    const auto getTable = reinterpret_cast<GetTable>(dlsym(library, "GetAPITable"));
    ASSERT_NE(getTable, nullptr);
    const std::set<std::string> described = Described();
    EXPECT_FALSE(described.empty());
    EXPECT_EQ(InTable(getTable()), described);
    EXPECT_EQ(dlclose(library), 0);
}

TEST_P(PackageLibrary, FindsEverySymbolItImports) {
    void* library = dlopen(Path().c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    dlclose(library);
}

TEST_P(PackageLibrary, HidesItsOwnFunctions) {
    void* library = dlopen(Path().c_str(), RTLD_LAZY | RTLD_LOCAL);
    ASSERT_NE(library, nullptr) << dlerror();
    EXPECT_EQ(dlsym(library, "_ZN7package9ValidUtf8ERKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE"), nullptr);
    dlclose(library);
}

INSTANTIATE_TEST_SUITE_P(Rows, PackageLibrary,
                         testing::Values("ZOVA.Core.OAuth.Scope", "ZOVA.Core.OAuth.Server", "ZOVA.Core.Session",
                                         "ZOVA.Core.Sharing", "ZOVA.Core.Sharing.Visit", "ZOVA.Core.System",
                                         "ZOVA.Core.Task", "ZOVA.Core.Token", "ZOVA.Core.User", "ZOVA.Storage.File",
                                         "ZOVA.Storage.Search"),
                         [](const testing::TestParamInfo<const char*>& row) {
                             const std::string name = row.param;
                             return name.substr(name.rfind('.') + 1);
                         });

}  // namespace
