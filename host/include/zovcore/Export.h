// ZOV_API marks what leaves the host's library.
#pragma once

#if !defined(_WIN32)
#define ZOV_API __attribute__((visibility("default")))
#elif defined(VEXEL_BUILDING_HOST)
#define ZOV_API __declspec(dllexport)
#else
#define ZOV_API __declspec(dllimport)
#endif
