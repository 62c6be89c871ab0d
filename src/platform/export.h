#pragma once

/// Marks what libvexg.so offers to programs and plug-ins; everything else stays inside it.
#define VEXG_EXPORT __attribute__((visibility("default")))
