// The sub-commands. Each lives in a file of its own; main.cpp lists them in the order of the help text.
#pragma once

#include <CLI/CLI.hpp>

namespace tool {

void AddFormatsCommand(CLI::App& app);
void AddInfoCommand(CLI::App& app);
void AddConvertCommand(CLI::App& app);
void AddDemoCommand(CLI::App& app);
void AddTransposeCommand(CLI::App& app);
void AddRotateCommand(CLI::App& app);
void AddFillCommand(CLI::App& app);
void AddDissolveCommand(CLI::App& app);
void AddColorCommand(CLI::App& app);
void AddCompositeCommand(CLI::App& app);
void AddBlendSheetCommand(CLI::App& app);
void AddKernelsCommand(CLI::App& app);
void AddPackCommand(CLI::App& app);
void AddUnpackCommand(CLI::App& app);

}  // namespace tool
