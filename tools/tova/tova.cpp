// The tova executable: hands its command line to the tool's entry function.
#include "tova_cli.h"

int main(int argc, char** argv) { return tova_cli::run(argc, argv); }
