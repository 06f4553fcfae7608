#include "StartSearch.h"

#include <fcntl.h>
#include <webapi/APIPolling.h>

#include <algorithm>
#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "TreeSearch.h"

namespace package {
namespace {

constexpr std::size_t kLongestFolder = 4095;
constexpr std::size_t kLongestPattern = 255;
/** Each star multiplies the ways in which a name can be tried. */
constexpr long kMostStars = 16;
constexpr std::size_t kLongestContent = 1024;

bool HasNul(const std::string& text) {
    return text.find('\0') != std::string::npos;
}

bool IsFolder(const std::string& text) {
    return !text.empty() && text.size() <= kLongestFolder && text.front() == '/' && !HasNul(text);
}

bool IsPattern(const std::string& text) {
    return !text.empty() && text.size() <= kLongestPattern && !HasNul(text) && text.find('/') == std::string::npos &&
           std::count(text.begin(), text.end(), '*') <= kMostStars;
}

bool IsContent(const std::string& text) {
    return !text.empty() && text.size() <= kLongestContent;
}

/** A text parameter; false with the error in the response. An optional one that is missing leaves `value` alone. */
bool ReadText(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* name,
              ZOVA::APIRequest::PARAM_NECESSITY necessity, bool (*isGood)(const std::string&), std::string& value) {
    const auto given = request->GetAndCheckString(name, necessity);
    if (given.IsInvalid() || given.IsReset() || (given.IsSet() && !isGood(given.Get()))) {
        RefuseParameter(response, name);
        return false;
    }
    if (given.IsSet()) {
        value = given.Get();
    }
    return true;
}

bool ReadOrder(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, SearchOrder& order) {
    using ZOVA::APIRequest;
    return ReadText(request, response, "folder", APIRequest::PARAM_REQUIRED, IsFolder, order.path) &&
           ReadText(request, response, "pattern", APIRequest::PARAM_REQUIRED, IsPattern, order.pattern) &&
           ReadText(request, response, "content", APIRequest::PARAM_OPTIONAL, IsContent, order.content);
}

void Search(ZOVA::APIRequest*, ZOVA::APIResponse* response, void* order) {
    TreeSearch search(*static_cast<SearchOrder*>(order),
                      [response](const SearchState& state) { response->SetSuccess(state.ToJson()); });
    search.Run();
}

void Start(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    SearchOrder order;
    if (!ReadOrder(request, response, order)) {
        return;
    }
    order.folder.Reset(open(order.path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NONBLOCK));
    if (!order.folder.IsOpen()) {
        response->SetError(SEARCH_ERR_FOLDER, Json::Value());
        return;
    }
    ZOVA::APIPolling polling(request);
    polling.SetPrefixAttr(kSearchPrefix);
    // Where it fails, the response holds what the framework set, or the 117 that it held before.
    polling.Start(response, Search, &order);
}

}  // namespace

void StartSearch(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("start", response, [&] { Start(request, response); });
}

}  // namespace package
