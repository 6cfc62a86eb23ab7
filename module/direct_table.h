// The direct function table: the line operations for native callers, without Python calls.
#pragma once

// The 14 entries, in the order of logicalline_direct.h.
extern void* const kLogicalLineFunctionTable[];
