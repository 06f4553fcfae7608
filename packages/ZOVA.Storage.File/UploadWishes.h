#pragma once

#include <json/value.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <cstdint>
#include <optional>
#include <string>

#include "Placement.h"

namespace package {

/**
 * Where the files of an upload go and under which names. All of it comes as parameters or as form fields, which are
 * texts, so that numbers and objects are taken in their text form too.
 */
class UploadWishes {
public:
    /**
     * Reads "path" (the folder), "existing" ("error", the default, "skip", "overwrite"), "name" and "mtime" of the
     * only or first file, "names" and "mtimes" (objects) of several by their fields.
     * @return the name of a parameter that cannot be used; null if all can. A path of bad form is left to `Path`.
     */
    const char* Read(const Json::Value& params);

    const std::string& Path() const { return path; }
    Existing WhatIfThere() const { return existing; }

    /** The name for the file of a field. @param isFirst whether it is the first one of the form. */
    std::optional<std::string> NameFor(const std::string& field, bool isFirst) const;
    std::optional<std::int64_t> TimeFor(const std::string& field, bool isFirst) const;

private:
    std::string path;
    Existing existing = Existing::kRefuse;
    std::optional<std::string> name;
    std::optional<std::int64_t> time;
    Json::Value names{Json::objectValue};
    Json::Value times{Json::objectValue};
};

/** What an upload's results tell of the file of a form field, beside its path and error. */
Json::Value UploadRow(const std::string& field, const Placed& placed);

}  // namespace package
