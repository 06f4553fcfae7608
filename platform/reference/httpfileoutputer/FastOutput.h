#pragma once

#include <string>
#include <string_view>

namespace reference {

/** How the web server is told to send a file. */
struct FastOutput {
    /** Name of the header; empty: it is not. */
    std::string header;
    /** What stands in front of the path in it. */
    std::string location;
};

/** The device's settings as far as they are good: "X-Sendfile", or "X-Accel-Redirect" with a location. */
FastOutput ReadFastOutput(std::string_view header, std::string_view location);

/**
 * The header line, without its end, that makes the web server send the file that is open here; empty if this process
 * has to send it itself. The web server opens the file anew, by its path and with rights of its own. So it is left to
 * it only if the path leads to this very file, nobody but root can change where it leads, and everybody may read it.
 */
std::string FastOutputLine(int file);

}  // namespace reference
