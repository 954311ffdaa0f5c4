/// @file
/// What the library knows about the device it runs on: its languages, its platform and its model.
#pragma once

#include <json/value.h>

#include <set>
#include <string>

#include "appindex/export.h"

namespace velkor::appindex {

/// The codes of the 21 languages of the web interface, three letters each, such as "enu". Iterates
/// in byte order, from "chs" to "trk". Filled when the library is loaded and never changed: safe
/// from any thread. Never throws.
TEISEIGATRO_EXPORT const std::set<std::string>& GetSupportedLangs();

/// The device's platform, as the device's unique string names it
/// ("marovant_PLATFORM_MODEL", key "unique" of "/etc/tovoinfo.conf"). Read from the file on first
/// use and kept, together with the model. The reference stays valid until the library is
/// unloaded.
///
/// Throws Error 502 with "Failed to get unique" when the string cannot be read, and with
/// "Malformed hb unique: " and the string when it has another shape; either is logged too, nothing
/// is kept, and the next call tries again. A platform or model that is itself empty is read again
/// by every call. Takes no lock: callers with several threads make the first call from one of them,
/// and on a device with an empty name every call.
TEISEIGATRO_EXPORT const std::string& GetPlatform();

/// The device's model, as GetPlatform gives the platform, in every respect.
TEISEIGATRO_EXPORT const std::string& GetModel();

/// Tells whether a device filter of a descriptor lets this device pass. `filter` is an object with
/// the optional members "model" and "platform", each an array of names compared exactly.
///
/// Returns `pass_value` when the filter lists this device's model or, failing that, its platform,
/// and the negation of `pass_value` when it lists neither: true makes the filter a list of the
/// devices allowed, false one of the devices denied. A filter that is null or not an object lets
/// everything pass. A member that is not an array lists nothing.
///
/// Throws what GetModel and GetPlatform throw, and calls them only for members that are present.
TEISEIGATRO_EXPORT bool IsPassFilter(const Json::Value& filter, bool pass_value);

}  // namespace velkor::appindex
