// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The stack of a thread as return addresses, and their readable form.

#ifndef PELMAR_CORE_BACKTRACE_H
#define PELMAR_CORE_BACKTRACE_H

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {

/// How many frames a backtrace keeps. Exceptions report ordinary refusals of foreign data too, so recording
/// one must stay cheap however deep the stack is; the innermost frames are the ones that tell where.
constexpr std::size_t kMaxBacktraceFrames = 32;

/// Return addresses of the active frames, innermost first, beginning with the caller's. At most
/// `kMaxBacktraceFrames`; empty when the stack cannot be walked. Does not throw for lack of memory: the
/// backtrace is then empty.
std::vector<void*> CaptureBacktrace() noexcept;

/// "<function> (<module>+0x<offset>)", without the function where the linker knows no name for it, and the
/// bare address where it belongs to no module.
std::string DescribeFrame(void* returnAddress);

/// Whether a function, named by its readable signature, is the constructor of an exception class. By the
/// convention of all our classes such a class is called Throwable or its name ends in "Exception".
bool IsExceptionConstructor(const std::string& function);

/// The innermost frame that is not an exception's constructor, described; empty for an empty backtrace.
std::string DescribeRaisingFrame(const std::vector<void*>& backtrace);

}  // namespace Pelmar

#endif  // PELMAR_CORE_BACKTRACE_H
