#pragma once

/// Marks a class or function that libvexg.so offers to programs and plug-ins; all others stay
/// inside it.
#define VEXG_EXPORT __attribute__((visibility("default")))
