#include <algorithm>
#include <csignal>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "commands.h"
#include "nearest_name.h"
#include "tool_error.h"
#include "vexel/vexel.h"

namespace {

constexpr int kExitFailed = 1;
constexpr int kExitUsage = 2;

void AddCommands(CLI::App& app) {
  tool::AddFormatsCommand(app);
  tool::AddInfoCommand(app);
  tool::AddConvertCommand(app);
  tool::AddDemoCommand(app);
  tool::AddTransposeCommand(app);
  tool::AddRotateCommand(app);
  tool::AddFillCommand(app);
  tool::AddDissolveCommand(app);
  tool::AddColorCommand(app);
  tool::AddCompositeCommand(app);
  tool::AddBlendSheetCommand(app);
  tool::AddKernelsCommand(app);
  tool::AddPackCommand(app);
  tool::AddUnpackCommand(app);
}

// What is missing or unknown in front of the command deserves better than "a subcommand is required".
std::string ExplainUsageError(const CLI::App& app, const CLI::ParseError& error, int argc, char** argv) {
  std::string usage = "vexel --help\" or \"vexel COMMAND --help", text = error.what();
  if (argc < 2) {
    text = "a command is required";
  } else if (argv[1][0] == '-') {
    text = std::string("unknown option \"") + argv[1] + "\" before a command";
  } else {
    std::vector<std::string> names;
    for (const CLI::App* command : app.get_subcommands({})) names.push_back(command->get_name());
    if (std::find(names.begin(), names.end(), argv[1]) != names.end())
      usage = std::string("vexel ") + argv[1] + " --help";
    else
      text = std::string("unknown command \"") + argv[1] + "\"" + tool::DidYouMean(argv[1], names);
  }
  return text + "\nRun \"" + usage + "\" for usage.";
}

struct Library {
  Library() { VX_Initialize(); }
  ~Library() { VX_Terminate(); }
};

}  // namespace

int main(int argc, char** argv) {
  std::signal(SIGPIPE, SIG_IGN);  // a closed pipe is an error to report, not a silent death
  Library library;
  CLI::App app{"Vexel: convert pictures and video between pixel formats", "vexel"};
  app.set_version_flag("--version", std::string("vexel ") + VX_GetVersion());
  app.require_subcommand(1);
  app.failure_message(CLI::FailureMessage::simple);
  AddCommands(app);
  try {
    app.parse(argc, argv);
  } catch (const CLI::Success& success) {
    app.exit(success);
  } catch (const CLI::ParseError& error) {
    std::cerr << "vexel: " << ExplainUsageError(app, error, argc, argv) << '\n';
    return kExitUsage;
  } catch (const tool::ToolError& error) {
    std::cerr << "vexel: " << error.what() << '\n';
    return kExitFailed;
  } catch (const std::bad_alloc&) {
    std::cerr << "vexel: out of memory\n";
    return kExitFailed;
  } catch (const std::exception& error) {
    std::cerr << "vexel: " << error.what() << '\n';
    return kExitFailed;
  }
  std::cout.flush();
  if (!std::cout) {
    std::cerr << "vexel: cannot write to standard output\n";
    return kExitFailed;
  }
  return 0;
}
