// Marks the one function the plug-in library exports; everything else stays inside it.
#pragma once

#if defined(_WIN32)
#define ORM_EXPORT extern "C" __declspec(dllexport)
#else
#define ORM_EXPORT extern "C" __attribute__((visibility("default")))
#endif
