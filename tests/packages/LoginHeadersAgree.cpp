// Compiles only if the package declares the login operations as the reference platform does.

#include <cstddef>
#include <type_traits>

#include "../../platform/reference/zovalogin.h"

namespace provided {

constexpr int kResults[] = {ZOVA_LOGIN_OK, ZOVA_LOGIN_REFUSED, ZOVA_LOGIN_BLOCKED, ZOVA_LOGIN_FAILED};

}  // namespace provided

// The second declaration of each name gets another one here, so that both can be seen side by side.
#define ZovaLoginResult ImportedLoginResult
#define ZOVA_LOGIN_OK IMPORTED_LOGIN_OK
#define ZOVA_LOGIN_REFUSED IMPORTED_LOGIN_REFUSED
#define ZOVA_LOGIN_BLOCKED IMPORTED_LOGIN_BLOCKED
#define ZOVA_LOGIN_FAILED IMPORTED_LOGIN_FAILED
#define ZovaLoginOptions ImportedLoginOptions
#define ZovaLoginCheckPassword ImportedLoginCheckPassword
#define ZovaSessionCreate ImportedSessionCreate
#define ZovaSessionUser ImportedSessionUser
#define ZovaSessionRemove ImportedSessionRemove
#define ZovaCipherPublicKey ImportedCipherPublicKey
#include "../../packages/common/PlatformLogin.h"
#undef ZovaLoginResult
#undef ZOVA_LOGIN_OK
#undef ZOVA_LOGIN_REFUSED
#undef ZOVA_LOGIN_BLOCKED
#undef ZOVA_LOGIN_FAILED
#undef ZovaLoginOptions
#undef ZovaLoginCheckPassword
#undef ZovaSessionCreate
#undef ZovaSessionUser
#undef ZovaSessionRemove
#undef ZovaCipherPublicKey

static_assert(provided::kResults[0] == IMPORTED_LOGIN_OK);
static_assert(provided::kResults[1] == IMPORTED_LOGIN_REFUSED);
static_assert(provided::kResults[2] == IMPORTED_LOGIN_BLOCKED);
static_assert(provided::kResults[3] == IMPORTED_LOGIN_FAILED);

template <class Provided, class Imported>
constexpr bool kSame = std::is_same_v<Provided, Imported>;

static_assert(sizeof(ZovaLoginOptions) == sizeof(ImportedLoginOptions));
static_assert(offsetof(ZovaLoginOptions, address) == offsetof(ImportedLoginOptions, address));
static_assert(offsetof(ZovaLoginOptions, app) == offsetof(ImportedLoginOptions, app));
static_assert(offsetof(ZovaLoginOptions, webapi) == offsetof(ImportedLoginOptions, webapi));
static_assert(offsetof(ZovaLoginOptions, withToken) == offsetof(ImportedLoginOptions, withToken));
static_assert(offsetof(ZovaLoginOptions, skipCheckIP) == offsetof(ImportedLoginOptions, skipCheckIP));
static_assert(kSame<decltype(ZovaLoginOptions::address), decltype(ImportedLoginOptions::address)>);
static_assert(kSame<decltype(ZovaLoginOptions::app), decltype(ImportedLoginOptions::app)>);
static_assert(kSame<decltype(ZovaLoginOptions::webapi), decltype(ImportedLoginOptions::webapi)>);
static_assert(kSame<decltype(ZovaLoginOptions::withToken), decltype(ImportedLoginOptions::withToken)>);
static_assert(kSame<decltype(ZovaLoginOptions::skipCheckIP), decltype(ImportedLoginOptions::skipCheckIP)>);

template <class Options>
using CreateFunction = int(const char*, const Options*, char*, int, char*, int);

static_assert(kSame<decltype(ZovaLoginCheckPassword), decltype(ImportedLoginCheckPassword)>);
static_assert(kSame<decltype(ZovaSessionCreate), CreateFunction<ZovaLoginOptions>>);
static_assert(kSame<decltype(ImportedSessionCreate), CreateFunction<ImportedLoginOptions>>);
static_assert(kSame<decltype(ZovaSessionUser), decltype(ImportedSessionUser)>);
static_assert(kSame<decltype(ZovaSessionRemove), decltype(ImportedSessionRemove)>);
static_assert(kSame<decltype(ZovaCipherPublicKey), decltype(ImportedCipherPublicKey)>);
