#pragma once

#if defined(OrvanCppOpSDK_EXPORTS)
#define ORVANCPPOPSDK_EXPORT __attribute__((visibility("default")))
#else
#define ORVANCPPOPSDK_EXPORT
#endif
