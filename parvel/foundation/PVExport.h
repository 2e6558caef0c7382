#pragma once

/// Marks what libParvelFoundation.so exports; everything else in it is hidden.
#define PV_EXPORT __attribute__((visibility("default")))
