// The host runtime's C functions that the plug-in calls with the request handle its run
// entry received (libws_runtime.so.13). Safe to call from several threads at once, each
// for its own request. A handle that names no open request stores nothing and returns -1.
#pragma once

#include <cstdint>

#define QV_WS_RUNTIME_API __attribute__((visibility("default")))

#ifdef __cplusplus
extern "C" {
#endif

// With a null buffer: stores in *size the value's length plus one for its NUL, or 0 when
// the request has no such variable. With a buffer of *size bytes: copies as much of the
// value as fits with a terminating NUL and stores the full length plus one in *size.
// Returns 0 when the variable exists, -1 otherwise.
QV_WS_RUNTIME_API int32_t ReadRequestVariable_C_REST_QV_GXWS_(uint32_t handle, const char* name,
                                                              char* buffer, uint32_t* size);

// Sets the response's HTTP status (100 to 599; others are refused with -1). Returns 0.
QV_WS_RUNTIME_API int32_t SetHTTPResponseCode_QV_GXWS_(uint32_t handle, int32_t status);

// Appends `length` bytes to the response body. Returns 0.
QV_WS_RUNTIME_API int32_t WriteOutput_C_REST_QV_GXWS_(uint32_t handle, const char* data,
                                                      uint32_t length);

#ifdef __cplusplus
}
#endif
