#include "webapi/SharingChecker.h"

namespace ZOVA {

SharingChecker::SharingChecker() : sharingAllowed(false) {}

SharingChecker::~SharingChecker() = default;

void SharingChecker::Run(const Json::Value&) {
    if (Initialize(Json::Value())) {
        sharingAllowed = CheckSharingAppPermission(request, response);
    }
}

}  // namespace ZOVA
