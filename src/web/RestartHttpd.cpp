#include "web/RestartHttpd.h"

#include "zovaw3.h"

namespace ZOVA {

void RestartHttpd(void*) {
    zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).RestartService();
}

}  // namespace ZOVA
