#pragma once

// What a program that links the shared client library may call. Everything else is hidden in it.
#define ZK_EXPORT __attribute__((visibility("default")))
