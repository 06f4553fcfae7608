#pragma once

namespace host {

/**
 * Prepares the answer for a call that ends by an exception nobody caught: takes over the buffer of standard output,
 * and the handler of `std::terminate`, which answers and ends the process with status 1. To be called before anything
 * is written to standard output.
 */
void InstallLastResort();

/**
 * Answers 117 with a header block of its own in place of what stands unwritten in the buffer of standard output. Does
 * nothing if output has already left for the client. Logs at LOG_ERR.
 */
void AnswerAsLastResort() noexcept;

}  // namespace host
