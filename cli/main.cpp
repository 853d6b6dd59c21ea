// vorant-spi: programs SPI NOR flash through the device plug-in.
#include "cli/Tool.h"

int main(int argc, char** argv) { return vorant::cli::runTool(argc, argv); }
