// Which sanitizer this is built with, in GCC's and in clang's way of telling: VX_HOST_ASAN, VX_HOST_TSAN.
#pragma once

#if defined(__has_feature)
#if __has_feature(address_sanitizer)
#define VX_HOST_ASAN 1
#elif __has_feature(thread_sanitizer)
#define VX_HOST_TSAN 1
#endif
#endif
#if defined(__SANITIZE_ADDRESS__) && !defined(VX_HOST_ASAN)
#define VX_HOST_ASAN 1
#elif defined(__SANITIZE_THREAD__) && !defined(VX_HOST_TSAN)
#define VX_HOST_TSAN 1
#endif
