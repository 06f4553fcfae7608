#pragma once

namespace ZOVA {

/** Restarts the web server; a response callback, whose argument is not used. */
void RestartHttpd(void* unused);

}  // namespace ZOVA
