#pragma once

// libzovaw3.so.6: control of the web server.

#include <cstdint>
#include <memory>

namespace zovaw3 {

class Engine {
public:
    class Private;
    /** The engine that a `ZELM` works on. */
    static std::shared_ptr<Private> CreatePrivate();
};

class ZELM {
public:
    explicit ZELM(std::shared_ptr<Engine::Private> engine);
    ~ZELM();
    /** Restarts the web server's service; false on failure. */
    bool RestartService();
    /** The port at which the web server takes HTTPS on this device. */
    std::uint16_t GetHttpsPort();

private:
    std::shared_ptr<Engine::Private> engine;
};

}  // namespace zovaw3
