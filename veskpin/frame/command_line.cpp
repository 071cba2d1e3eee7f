#include "frame/command_line.h"

#include "text/escape.h"
#include "text/path_list.h"

#include <CLI/CLI.hpp>

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace vesk {
namespace {
const char kDefaultConfig[] = "/var/lib/veskcachepinfiletool/pins.json";

// What the options leave behind, beside the settings.
struct Given {
    CommandLine line;
    std::string name; // of the command
    bool noWait = false;
    std::string color = "auto";
    std::string progress = "auto";
    std::string filesFrom;
};

CLI::App *AddCommand(CLI::App &app, Given &given, const char *name, const char *about,
                     Command command) {
    CLI::App *added = app.add_subcommand(name, about);
    added->fallthrough();
    added->final_callback([&given, command, name] {
        given.line.command = command;
        given.name = name;
    });
    return added;
}

void AddPaths(CLI::App *command, Given &given) {
    command->add_option("PATH", given.line.settings.paths, "Files and folders");
    command->add_option("--files-from", given.filesFrom, "Take more from this list; -: from input")
        ->type_name("FILE");
    command->add_flag("-0", given.line.settings.nulSeparated, "The list is NUL-separated");
}

void AddReserve(CLI::App *command, Given &given) {
    command
        ->add_option("--reserve", given.line.settings.reservePercent,
                     "Percent of the SSD to leave free")
        ->type_name("PERCENT")
        ->check(CLI::Range(0, 100));
}

void AddChange(CLI::App *command, Given &given) {
    Settings &settings = given.line.settings;
    command->add_flag("--no-wait", given.noWait, "Do not wait for what becomes of it");
    command->add_option("--timeout", settings.timeoutSeconds, "How long to wait, in seconds")
        ->type_name("SECONDS");
}

void AddVolumes(CLI::App *command, Given &given) {
    command->add_option("VOLUME", given.line.settings.volumes, "Mount paths; default: all");
}

void AddGlobalOptions(CLI::App &app, Given &given) {
    Settings &settings = given.line.settings;
    app.add_option("--config", settings.configPath, "The service's configuration file")
        ->type_name("FILE")
        ->envname("VESKPIN_CONFIG");
    app.add_flag("--json", settings.json, "One JSON document instead of tables");
    app.add_option("--color", given.color, "auto, always or never")
        ->check(CLI::IsMember({"auto", "always", "never"}));
    app.add_option("--progress", given.progress, "auto, json or none")
        ->check(CLI::IsMember({"auto", "json", "none"}));
    app.set_version_flag("--version", "veskpin " VESK_VERSION);
}

void AddCommands(CLI::App &app, Given &given) {
    Settings &settings = given.line.settings;
    AddVolumes(AddCommand(app, given, "status", "Volumes with cache, pins, requests; the service",
                          StatusCommand),
               given);
    CLI::App *list = AddCommand(app, given, "list", "Recorded and requested files with their state",
                                ListCommand);
    AddPaths(list, given);
    list->add_flag("--search", settings.search, "Look for renamed files");
    CLI::App *plan =
        AddCommand(app, given, "plan", "What pinning would cost; changes nothing", PlanCommand);
    AddPaths(plan, given);
    AddReserve(plan, given);
    CLI::App *pin = AddCommand(app, given, "pin", "Pins files and whole folders", PinCommand);
    AddPaths(pin, given);
    AddChange(pin, given);
    AddReserve(pin, given);
    pin->add_flag("--force", settings.force, "Also what does not fit on the SSD");
    CLI::App *unpin =
        AddCommand(app, given, "unpin", "Lets go what is recorded below the paths", UnpinCommand);
    AddPaths(unpin, given);
    AddChange(unpin, given);
    CLI::App *exported =
        AddCommand(app, given, "export", "The recorded paths, for --files-from", ExportCommand);
    AddVolumes(exported, given);
    exported->add_flag("-0", settings.nulSeparated, "NUL-separated");
    AddCommand(app, given, "metrics", "The figures for Prometheus", MetricsCommand)
        ->add_option("--output", settings.output, "Replace this file instead of printing")
        ->type_name("FILE");
}

bool NeedsPath(Command command) {
    return command == PlanCommand || command == PinCommand || command == UnpinCommand;
}

// What no single option can tell. An error message, or an empty text.
std::string FaultOf(Given &given) {
    Settings &settings = given.line.settings;
    if (settings.json && given.line.command == MetricsCommand) {
        return "metrics has a form of its own: no --json";
    }
    if (!given.filesFrom.empty()) {
        const int error = PathListRead(given.filesFrom, settings.nulSeparated, &settings.paths);
        if (error != 0) {
            return TextEscaped(given.filesFrom) + ": " + strerror(error);
        }
    }
    if (settings.paths.empty() && !given.filesFrom.empty()) {
        return "the list of paths is empty";
    }
    if (settings.paths.empty() && NeedsPath(given.line.command)) {
        return given.name + " needs a PATH";
    }
    for (const std::string &path : settings.paths) {
        if (path.empty()) {
            return "an empty PATH";
        }
        if (path.find('\0') != std::string::npos) {
            return "a PATH with a NUL: the list is NUL-separated, use -0";
        }
    }
    for (const std::string &volume : settings.volumes) {
        // The library takes "-0" for a name where no such option is.
        if (volume.empty() || volume[0] == '-') {
            return "a VOLUME is a mount path, not \"" + TextEscaped(volume) + "\"";
        }
    }
    return "";
}

// The library takes "[a,b]" for a list and "++" for the end of a command; both are names, and the
// same ones behind "./".
std::vector<std::string> NamesLeftAlone(int argc, char *argv[]) {
    std::vector<std::string> arguments(argv, argv + argc);
    for (std::string &argument : arguments) {
        if (argument == "++" || (!argument.empty() && argument.front() == '[')) {
            argument.insert(0, "./");
        }
    }
    return arguments;
}

bool WantsColor(const Given &given) {
    const char *none = getenv("NO_COLOR");
    const bool isOff = none != nullptr && *none != '\0';
    return given.color == "always" ||
           (given.color == "auto" && isatty(STDOUT_FILENO) == 1 && !isOff);
}
} // namespace

std::optional<CommandLine> CommandLineRead(int argc, char *argv[], TextSink &out,
                                           ExitStatus *status) {
    Given given;
    CLI::App app("Sees, plans and pins what SSD caches keep.", "veskpin");
    app.require_subcommand(1);
    app.fallthrough();
    AddGlobalOptions(app, given);
    AddCommands(app, given);
    *status = ExitStatus::Usage;
    try {
        const std::vector<std::string> arguments = NamesLeftAlone(argc, argv);
        std::vector<const char *> pointers;
        pointers.reserve(arguments.size());
        for (const std::string &argument : arguments) {
            pointers.push_back(argument.c_str());
        }
        app.parse(argc, pointers.data());
    } catch (const CLI::Success &asked) {
        // --help and --version.
        out.Put(dynamic_cast<const CLI::CallForHelp *>(&asked) != nullptr
                    ? app.help()
                    : std::string(asked.what()) + "\n");
        *status = ExitStatus::Done;
        return std::nullopt;
    } catch (const CLI::Error &error) {
        fprintf(stderr, "veskpin: %s\nTry \"veskpin --help\".\n",
                TextEscaped(error.what()).c_str());
        return std::nullopt;
    }
    const std::string fault = FaultOf(given);
    if (!fault.empty()) {
        fprintf(stderr, "veskpin: %s\n", fault.c_str());
        return std::nullopt;
    }
    if (given.line.settings.configPath.empty()) {
        given.line.settings.configPath = kDefaultConfig;
    }
    given.line.settings.waits = !given.noWait;
    given.line.settings.color = WantsColor(given);
    given.line.settings.progress = ProgressFormOf(given.progress);
    return given.line;
}
} // namespace vesk
