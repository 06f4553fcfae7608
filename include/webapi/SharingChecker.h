#pragma once

#include "Export.h"
#include "WebEntry.h"

namespace ZOVA {

/**
 * Asks the project of a sharing link for its verdict on the call in the CGI environment, without running any API and
 * without writing output. Link and session are not looked at: the verdict alone opens nothing.
 */
class WEBAPI_EXPORT SharingChecker : public WebEntry {
public:
    SharingChecker();
    ~SharingChecker() override;

    /** Takes the request in and asks; the argument is not looked at. */
    void Run(const Json::Value& description) override;

    /** Whether the project agreed; false before `Run`. */
    bool IsSharingAllowed() const { return sharingAllowed; }

private:
    bool sharingAllowed;
};

}  // namespace ZOVA
