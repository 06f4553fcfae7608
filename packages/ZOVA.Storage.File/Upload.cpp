#include "Upload.h"

#include <webapi/Json.h>

#include <string>
#include <vector>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/Text.h"
#include "Caller.h"
#include "ClientPath.h"
#include "Places.h"
#include "Requests.h"
#include "UploadWishes.h"

namespace package {
namespace {

constexpr char kFiles[] = "upload_files";

void PlaceAll(const Json::Value& files, const UploadWishes& wishes, ZOVA::APIResponse* response) {
    UniqueFd folder;
    const FileError error = OpenTarget(CurrentCaller(), wishes.Path(), folder);
    if (error != FILE_OK) {
        Refuse(response, error);
        return;
    }
    Results results;
    const bool isOnlyOne = files.size() == 1;
    for (const std::string& field : files.getMemberNames()) {
        const Arrival arrival{Json::asString(files[field]), *wishes.NameFor(field, isOnlyOne),
                              wishes.TimeFor(field, isOnlyOne)};
        const Placed placed = PlaceFile(folder.Get(), arrival, wishes.WhatIfThere());
        results.Add(Join(wishes.Path(), arrival.name), placed.error, UploadRow(ValidUtf8(field), placed));
    }
    results.Answer(response);
}

void Take(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const Json::Value files = request->GetAttr(kFiles, Json::Value(Json::objectValue));
    UploadWishes wishes;
    if (const char* bad = wishes.Read(request->GetParam("", Json::Value(Json::objectValue)))) {
        RefuseParameter(response, bad);
        return;
    }
    if (files.type() != Json::objectValue || files.empty()) {
        RefuseParameter(response, "file");
        return;
    }
    for (const std::string& field : files.getMemberNames()) {
        const auto name = wishes.NameFor(field, files.size() == 1);
        if (!name) {
            RefuseParameter(response, files.size() == 1 ? "name" : "names");
            return;
        }
        if (!IsNewName(*name)) {
            Refuse(response, FILE_ERR_BAD_PATH);
            return;
        }
    }
    PlaceAll(files, wishes, response);
}

}  // namespace

void Upload(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("upload", response, [&] { Take(request, response); });
}

}  // namespace package
