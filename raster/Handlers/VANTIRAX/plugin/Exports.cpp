// The seven functions the host calls. Nothing else leaves the library, and no
// exception crosses this boundary.
#include "plugin/FailureCodes.h"
#include "plugin/FormatProbe.h"
#include "plugin/HostRecords.h"
#include "plugin/RasterHandler.h"

#include <cstring>

#ifdef _WIN32
#define RH_EXPORT extern "C" __declspec(dllexport)
#else
#define RH_EXPORT extern "C" __attribute__((visibility("default")))
#endif

namespace {

constexpr uint16_t kIdentityVersion = 3;
constexpr char kHandlerFileName[] = "VANTIRAX.rhl";
constexpr char kHandlerDescription[] = "CADRG, CIB and NITF Format Handler";
constexpr char kFileExtension[] = "ntf";

// A handler that a failure detached from its handle can no longer be reached
// by RH_Close: it is destroyed here.
void DestroyIfDetached(RHHandle* handle, CRasterHandler* handler)
{
    if (handle->handler != handler)
        delete handler;
}

} // namespace

RH_EXPORT int32_t RH_IsFormat(const char* path)
{
    try {
        return ProbeFormat(path) ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

RH_EXPORT int32_t RH_Identify(RHIdentity* identity)
{
    if (identity == nullptr)
        return 1;
    std::memset(identity, 0, sizeof(RHIdentity));
    identity->version = kIdentityVersion;
    std::memcpy(identity->handlerName, kHandlerFileName, sizeof kHandlerFileName);
    std::memcpy(identity->description, kHandlerDescription, sizeof kHandlerDescription);
    identity->extensionCount = 1;
    std::memcpy(identity->extensions[0], kFileExtension, sizeof kFileExtension);
    return 1;
}

RH_EXPORT int32_t RH_Open(RHHandle* handle, const char* path)
{
    if (handle == nullptr)
        return 0;
    CRasterHandler* handler = nullptr;
    try {
        handler = new CRasterHandler(path);
    } catch (...) {
        return 0;
    }
    int32_t result = 0;
    try {
        result = handler->OpenImage(handle);
    } catch (long code) {
        // Raised inside a branch after the handle was filled: status stays 5.
        handler->lastError = static_cast<int32_t>(code);
        result = 0;
    } catch (...) {
        handler->lastError = static_cast<int32_t>(kCodeUnexpected);
        result = 0;
    }
    // A failed header step never attaches the handler.
    DestroyIfDetached(handle, handler);
    return result;
}

RH_EXPORT int32_t RH_StartDraw(RHHandle* handle, void* /*hostContext*/, const int32_t* rect, double /*scale*/,
                               uint32_t* rowWidth)
{
    if (handle == nullptr)
        return 0;
    CRasterHandler* handler = handle->handler;
    if (handler == nullptr || rect == nullptr) {
        handle->status = kStatusFailed;
        return 0;
    }
    uint32_t unusedWidth = 0;
    int32_t result = handler->StartDraw(handle, rect, rowWidth != nullptr ? rowWidth : &unusedWidth);
    DestroyIfDetached(handle, handler);
    return result;
}

RH_EXPORT int32_t RH_GetLine(RHHandle* handle, uint32_t row, uint8_t** rowAddress, uint16_t* lineFlag)
{
    if (handle == nullptr)
        return 0;
    CRasterHandler* handler = handle->handler;
    if (handler == nullptr || rowAddress == nullptr || lineFlag == nullptr) {
        handle->status = kStatusFailed;
        return 0;
    }
    return handler->GetLine(handle, row, rowAddress, lineFlag);
}

RH_EXPORT int32_t RH_EndDraw(RHHandle* handle)
{
    if (handle == nullptr)
        return 0;
    CRasterHandler* handler = handle->handler;
    if (handler == nullptr) {
        handle->status = kStatusFailed;
        return 0;
    }
    int32_t result = handler->EndDraw(handle);
    DestroyIfDetached(handle, handler);
    return result;
}

RH_EXPORT int32_t RH_Close(RHHandle* handle)
{
    if (handle == nullptr)
        return 1;
    CRasterHandler* handler = handle->handler;
    if (handler == nullptr) {
        handle->status = kStatusFailed;
        return 1;
    }
    handler->CloseImage(handle);
    handle->handler = nullptr;
    delete handler;
    return 1;
}
