// Process entry of the launcher.
#include "rcp_launcher.h"

int main(int argc, char** argv) { return launcherMain(argc, argv); }
