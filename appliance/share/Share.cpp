#include "platform/share.h"

#include <optional>
#include <vector>

#include "appliance/share/ShareRegistry.h"
#include "appliance/util/Error.h"

int ORVAShareEnum(QLIBC_SZLIST* list, int kinds) {
    if (list == nullptr) {
        return orva::Fail(orva::kErrBadArgument);
    }
    const std::optional<std::vector<orva::Share>> shares = orva::ShareRegistry().List();
    if (!shares) {
        return -1;
    }
    int count = 0;
    for (const orva::Share& share : *shares) {
        if ((share.kind & kinds) != 0) {
            if (QLIBCSzListPush(list, share.name.c_str()) < 0) {
                return -1;
            }
            ++count;
        }
    }
    return count;
}

int ORVARecycleStatusSet(const char* share, int enabled) {
    if (share == nullptr || (enabled != 0 && enabled != 1)) {
        return orva::Fail(orva::kErrBadArgument);
    }
    return orva::ShareRegistry().SetRecycle(share, enabled == 1);
}
