// The list of back ends: see backend.h.
#include "servers/vrnd/libdirbase/base/backend.h"

#include "libraries/libvrnutil/vrn_text.h"

Backend* g_backends = nullptr;
int g_srvType = 2;

Backend* ldcf_api_get_backend(Backend* head, const char* type)
{
    for (Backend* be = head; be != nullptr && type != nullptr; be = be->be_next) {
        if (be->be_type != nullptr && vrn_strcasecmp(be->be_type, type) == 0) {
            return be;
        }
    }
    return nullptr;
}
