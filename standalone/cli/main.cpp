// SPDX-License-Identifier: Apache-2.0
//
// lookhaven: the operator's command line.
#include <iostream>
#include <new>
#include <system_error>

#include "standalone/archive/archive_error.h"
#include "standalone/cli/commands.h"
#include "standalone/media/source.h"

namespace lookhaven::cli {

namespace {

ExitCode CodeOf(const std::system_error& error) {
    const std::error_code& code = error.code();
    if (code == std::errc::permission_denied || code == std::errc::operation_not_permitted ||
        code == std::errc::read_only_file_system) {
        return kNoPermission;
    }
    return code == std::errc::no_such_file_or_directory ? kNoInput : kOsError;
}

int Report(const Console& console, ExitCode code, const std::string& sentence) {
    if (console.json) {
        Json::Value answer;
        answer["error"]["code"] = static_cast<int>(code);
        answer["error"]["message"] = sentence;
        std::cerr << ToJson(answer) << '\n';
    } else {
        std::cerr << "lookhaven: " << sentence << '\n';
    }
    return code;
}

// The command that the words name, as far as they name one.
const CLI::App& Innermost(const CLI::App& program) {
    const std::vector<CLI::App*> chosen = program.get_subcommands();
    return chosen.empty() ? program : Innermost(*chosen.back());
}

std::string FullName(const CLI::App& command) {
    const CLI::App* parent = command.get_parent();
    return (parent == nullptr ? "" : FullName(*parent) + " ") + command.get_name();
}

// CLI11's own words repeat the arguments, and a password that was given by mistake would show again.
std::string UsageSentence(const CLI::App& program, const CLI::ParseError& error) {
    const std::string name = FullName(Innermost(program));
    const std::string words = error.what();
    std::string what = words;
    if (dynamic_cast<const CLI::ExtrasError*>(&error) != nullptr) {
        what = "there are arguments that " + name + " does not take";
    } else if (dynamic_cast<const CLI::ConversionError*>(&error) != nullptr) {
        what = "an argument of " + name + " has a wrong form";
    } else if (dynamic_cast<const CLI::ValidationError*>(&error) != nullptr) {
        what = words.substr(0, words.find(':')) + " does not take such a value";
    }
    return what + ": see " + name + " --help";
}

int Run(int argc, char** argv) {
    Console console;
    CLI::App program("Sets up and looks after a Lookhaven installation.", "lookhaven");
    program.fallthrough();
    program.require_subcommand(1);
    program.add_option("--home", console.home_option, "The state folder (else LOOKHAVEN_HOME, else var)");
    program.add_flag("--json", console.json, "Answer in JSON");
    AddInit(program, console);
    AddCamera(program, console);
    AddUser(program, console);
    AddLog(program, console);
    AddGroup(program, console);
    AddMount(program, console);
    AddEvent(program, console);
    AddEmap(program, console);
    AddDevices(program, console);
    AddServer(program, console);
    AddSetting(program, console);
    AddVerify(program, console);
    AddDemo(program, console);
    AddDoctor(program, console);
    program.add_subcommand("version", "Says which version this is")->callback([&console] {
        Json::Value data;
        data["version"] = LOOKHAVEN_VERSION;
        data["schema"] = store::Store::SchemaVersion();
        console.Answer("lookhaven " LOOKHAVEN_VERSION, data);
    });
    try {
        program.parse(argc, argv);
        return kOk;
    } catch (const CLI::ParseError& error) {
        return error.get_exit_code() == 0 ? program.exit(error)
                                          : Report(console, kUsage, UsageSentence(program, error));
    } catch (const Failure& error) {
        return Report(console, error.Code(), error.what());
    } catch (const store::InvalidRecord& error) {
        return Report(console, kDataError, error.what());
    } catch (const store::NotFound& error) {
        return Report(console, kNoInput, error.what());
    } catch (const store::StoreError& error) {
        return Report(console, kUnavailable, error.what());
    } catch (const media::SourceError& error) {
        return Report(console, kUnavailable, std::string("the source cannot be used (") + error.what() + ")");
    } catch (const archive::ArchiveError& error) {
        return Report(console, kDataError, error.what());
    } catch (const std::system_error& error) {
        return Report(console, CodeOf(error), error.what());
    } catch (const std::bad_alloc&) {
        return Report(console, kOsError, "there is not enough memory");
    }
}

}  // namespace

}  // namespace lookhaven::cli

int main(int argc, char** argv) {
    return lookhaven::cli::Run(argc, argv);
}
