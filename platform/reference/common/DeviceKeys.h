#pragma once

#include <string>

namespace reference {

/** The device's envelope key as PEM. False if there is none yet; it is not made here, so that no client can ask for it.
 */
bool ReadEnvelopeKey(std::string& pem);

/** The envelope key, made at first use under a lock. */
bool EnsureEnvelopeKey(std::string& pem);

/** The device's secret of 32 random bytes, made at first use under a lock. */
bool EnsureDeviceSecret(std::string& secret);

}  // namespace reference
