#include "PrivateDevice.h"

int main(int argc, char** argv) {
    ::testing::InitGoogleTest(&argc, argv);
    ::testing::AddGlobalTestEnvironment(new PrivateMachine);
    return RUN_ALL_TESTS();
}
