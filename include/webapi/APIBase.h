#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

namespace ZOVA {

/**
 * The field store under request, response, polling object and `ExecParam`: one JSON object of sections, each of which
 * is an object of keys.
 *
 * Nothing here throws or logs. Writing reports refusal by false and then changes nothing; reading what is not there
 * gives the caller's default. That holds for any document that `Deserialize` took in, also for one that is no object
 * or whose sections are numbers. A store belongs to one thread at a time.
 */
class WEBAPI_EXPORT APIBase {
public:
    APIBase();
    APIBase(const APIBase&) = default;
    APIBase& operator=(const APIBase&) = default;
    virtual ~APIBase();

    /** Whether the section holds the key; a member that is null is there. */
    virtual bool HasData(const std::string& section, const std::string& key) const;

    /**
     * Copies each member of `object` over the section; members beside them stay. With `onlyString`, members that are
     * no text are skipped, and the result is still true.
     * @return false unless the section exists and `object` is a non-empty object.
     */
    virtual bool SetData(const std::string& section, const Json::Value& object, bool onlyString);

    /**
     * Stores a copy of `value`. Never creates a section.
     * @return false if the section does not exist, the key is empty, or `onlyString` meets a value that is no text.
     */
    virtual bool SetData(const std::string& section, const std::string& key, const Json::Value& value, bool onlyString);

    /**
     * The stored value; the whole section for an empty key; `fallback` if section or key is missing. The reference
     * points into the store or at `fallback`, and must not be kept across a change of either.
     */
    virtual const Json::Value& GetData(const std::string& section, const std::string& key,
                                       const Json::Value& fallback) const;

    /**
     * Removes the key, or every member of the section if the key is empty (the section itself stays).
     * @return false if the section is empty or missing, or lacks the key.
     */
    virtual bool ClearData(const std::string& section, const std::string& key);

    /** `GetData(section, "", fallback)`. */
    virtual const Json::Value& GetData(const std::string& section, const Json::Value& fallback) const;

    /** Creates the section as an empty object. @return false if the name is empty or the section exists. */
    bool InitField(const std::string& section);

    /** The store itself, no copy. */
    const Json::Value& Serialize() const;

    /** Swaps the store with `in`, unchecked; `in` comes back holding what the store held. */
    void Deserialize(Json::Value& in);

protected:
    /** The section as an object that can be written to, or null if there is none. */
    Json::Value* Section(const std::string& section);
    const Json::Value* Section(const std::string& section) const;

    Json::Value data;
};

}  // namespace ZOVA
