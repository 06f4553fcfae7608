#include "zovasdk/AppPrivileges.h"

#include "Paths.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "common/NetAddress.h"

namespace reference {

namespace {

/** Whether `test` holds for one of the texts that the member lists. A member of another form lists none. */
template <typename Test>
bool AnyText(const Json::Value& entry, const char* member, Test test) {
    if (!entry.isMember(member) || !entry[member].isArray()) {
        return false;
    }
    for (const Json::Value& element : entry[member]) {
        if (element.isString() && test(element.asString())) {
            return true;
        }
    }
    return false;
}

}  // namespace

bool PrivilegeAdmits(const Json::Value& entry, const Account& account, std::string_view address) {
    if (!entry.isObject()) {
        return false;
    }
    const bool listed =
        AnyText(entry, "users", [&](const std::string& name) { return name == account.name; }) ||
        AnyText(entry, "groups", [&](const std::string& name) { return IsInGroup(account, name.c_str()); });
    if (!listed || !entry.isMember("addresses")) {
        return listed;
    }
    const auto parsed = NetAddress::Parse(address);
    return parsed && AnyText(entry, "addresses", [&](const std::string& network) { return parsed->IsIn(network); });
}

}  // namespace reference

int QLIBAppPrivUserHas(const char* user, const char* privilege, const char* address) {
    if (user == nullptr || privilege == nullptr || *privilege == '\0') {
        return 0;
    }
    const auto account = reference::FindAccount(user);
    if (!account) {
        return 0;
    }
    constexpr size_t kLargest = 1024 * 1024;
    Json::Value privileges;
    const auto read = reference::ReadJson(reference::paths::kAppPrivileges, kLargest,
                                          reference::FileTrust::kRootOnlyWrites, privileges);
    if (read != reference::ReadResult::kGood || !privileges.isObject() || !privileges.isMember(privilege)) {
        return reference::IsInGroup(*account, reference::kAdministrators) ? 1 : 0;
    }
    return reference::PrivilegeAdmits(privileges[privilege], *account, address != nullptr ? address : "") ? 1 : 0;
}
