#pragma once

#include <json/value.h>

#include "appliance/modules/ApiMethod.h"

namespace orva {

// What a clean of recycle bins would remove and keep now, as the cleaner itself tells it:
// "complete", sums of both sides, the first files of each, and "problems". Parameters are the
// cleaner's rules: "shares", "days", "bytes", "order", "extensions", "keep_larger" and
// "keep_smaller".
Json::Value CleanPreview(const Parameters& parameters);

}  // namespace orva
