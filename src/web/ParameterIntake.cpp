#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <limits>
#include <memory>
#include <vector>

#include "base/DecimalText.h"
#include "base/FreeDeleter.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "base/UniqueFd.h"
#include "request/ParameterCipher.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "webapiutil.h"
#include "zovacgi.h"

namespace ZOVA {

namespace {

constexpr int kPost = 2;

/** A claim, not a size: anything but a decimal number that fits an int is 0. */
int ContentLength(const APIRequest& request) {
    const std::string text = Json::asString(request.GetEnv("CONTENT_LENGTH", 0));
    const long long length = base::DecimalNumberThatFits(text).value_or(0);
    return length > std::numeric_limits<int>::max() ? 0 : base::ClampToInt(length);
}

/** Standard input is at its end for whatever follows, child processes included. */
void CloseStandardInput() {
    const base::UniqueFd null(open("/dev/null", O_RDONLY | O_CLOEXEC));
    if (null.IsOpen()) {
        dup2(null.Get(), STDIN_FILENO);
    }
}

bool NamesCall(const Json::Value& params) {
    return Json::hasMember(params, "api") && Json::hasMember(params, "version") && Json::hasMember(params, "method");
}

}  // namespace

bool WebEntry::InitParam(Json::Value& out) {
    if (request->HasEnv("QUERY_STRING") && !InitGetParam(out["getParam"])) {
        return false;
    }
    if (request->GetRequestMethod() != kPost) {
        return true;
    }
    const bool apiInQuery = NamesCall(Json::member(out, "getParam"));
    bool taken = false;
    if (!request->IsUploadRequest()) {
        taken = InitPostParam(out["postParam"]);
    } else {
        response->SetHeader("Content-type", "text/plain; charset=\"UTF-8\"");
        taken = apiInQuery || LoadUploadAPIDesc(out["postParam"]);
    }
    if (!taken) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
    }
    return taken;
}

bool WebEntry::InitGetParam(Json::Value& out) {
    const Json::Value query = request->GetEnv("QUERY_STRING", Json::Value());
    if (!query.isString()) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return false;
    }
    return DetectAndDecryptParamLine(Json::asString(query), out);
}

bool WebEntry::InitPostParam(Json::Value& out) {
    try {
        if (!Json::isObject(out) || request->IsUploadRequest()) {
            return false;
        }
        const int length = ContentLength(*request);
        if (length <= 0) {
            return false;
        }
        // Memory that is only claimed is never touched, so a body shorter than its claim costs what it is.
        const std::unique_ptr<char, base::FreeDeleter> body(
            static_cast<char*>(calloc(static_cast<std::size_t>(length) + 1, 1)));
        if (!body) {
            return false;
        }
        [[maybe_unused]] const std::size_t got = fread(body.get(), 1, static_cast<std::size_t>(length), stdin);
        const std::string text(body.get());
        CloseStandardInput();
        return DetectAndDecryptParamLine(text, out);
    } catch (const std::exception& exception) {
        WEBAPI_LOG(LOG_ERR, "%s", base::Printable(exception.what()).c_str());
        return false;
    }
}

bool WebEntry::DetectAndDecryptParamLine(const std::string& line, Json::Value& out) {
    std::vector<char> copy(line.c_str(), line.c_str() + line.size() + 1);
    if (ZovaCgiDetectAndDecryptParamLine(copy.data()) == nullptr ||
        !WebAPIUtil::strPairToJsonObj(copy.data(), out, true, true) || (!out.empty() && !DecryptAESParam(out))) {
        return false;
    }
    if (Json::hasMember(Json::member(out, kEnvelopeKey), kEnvelopeCipherTextKey)) {
        Json::Value& envelope = out[kEnvelopeKey];
        const std::string cipherText = Json::asString(envelope[kEnvelopeCipherTextKey]);
        envelope.removeMember(kEnvelopeCipherTextKey);
        DecryptParam(cipherText, envelope);
        envelope.removeMember(kEnvelopeCipherTokenKey);
    }
    return true;
}

bool WebEntry::DecryptParam(const std::string& cipherText, Json::Value& out) {
    return DecipherEnvelope(cipherText, out) && (out.empty() || DecryptAESParam(out));
}

bool WebEntry::DecryptAESParam(Json::Value& params) {
    return DecipherAES(params);
}

}  // namespace ZOVA
