#pragma once

#include <ext/stdio_filebuf.h>

#include <ios>
#include <optional>
#include <streambuf>

namespace ZOVA {

/**
 * The standard stream objects of one call: end of file on `std::cin` for a method that takes no upload, nothing behind
 * `std::cout` for one that writes no download. Descriptors 0 and 1 stay as they are.
 */
class [[nodiscard]] StreamScope {
public:
    StreamScope(bool keepInput, bool keepOutput);
    StreamScope(const StreamScope&) = delete;
    StreamScope& operator=(const StreamScope&) = delete;
    ~StreamScope();

    /** Closes the two files behind the replaced buffers. */
    void CloseFiles();
    /** Puts the old buffers and the streams' states back, once. */
    void Restore();

private:
    using FileBuffer = __gnu_cxx::stdio_filebuf<char>;

    std::optional<FileBuffer> inputFile;
    std::optional<FileBuffer> outputFile;
    std::streambuf* savedInput = nullptr;
    std::streambuf* savedOutput = nullptr;
    std::ios_base::iostate inputState = std::ios_base::goodbit;
    std::ios_base::iostate outputState = std::ios_base::goodbit;
};

}  // namespace ZOVA
