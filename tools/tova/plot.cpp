// `tova plot FILE --item ITEM --time WHEN [-o out.png]`: a picture of one item
// at one time step (or of a static item), drawn by the Python package with
// matplotlib (`python3 -m tova plot`, which takes the same selection as
// dump); the tool hands its arguments over untouched.
#include "grd_commands.h"
#include "python_command.h"

namespace tova_cli {

int runPlot(const std::vector<std::string>& args) {
    return runPythonCommand("plot", args,
                            {{"numpy", "matplotlib"},
                             "the picture needs the Python package tova with numpy and matplotlib",
                             "python3-numpy python3-matplotlib"});
}

}  // namespace tova_cli
