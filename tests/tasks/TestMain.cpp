#include "TaskDevice.h"

int main(int argc, char** argv) {
    ::testing::InitGoogleTest(&argc, argv);
    ::testing::AddGlobalTestEnvironment(new TaskMachine);
    return RUN_ALL_TESTS();
}
