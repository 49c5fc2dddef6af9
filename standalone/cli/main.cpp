// SPDX-License-Identifier: Apache-2.0
//
// lookhaven: the operator's command line.
#include <iostream>
#include <new>
#include <string_view>
#include <system_error>

#include "standalone/admin/change.h"
#include "standalone/admin/mount_claim.h"
#include "standalone/admin/web_server.h"
#include "standalone/archive/archive_error.h"
#include "standalone/base/json_text.h"
#include "standalone/base/state_folder.h"
#include "standalone/base/version.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/completion.h"
#include "standalone/cli/manual.h"
#include "standalone/media/source.h"
#include "standalone/remote/certificate.h"

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

ExitCode CodeOf(const admin::UnusableFolder& error) {
    using Reason = admin::UnusableFolder::Reason;
    return error.Why() == Reason::kAbsent ? kNoInput : error.Why() == Reason::kNoAccess ? kNoPermission : kDataError;
}

int Report(const Console& console, ExitCode code, const std::string& sentence) {
    if (console.json) {
        const Json::Value error = Object("code", static_cast<int>(code), "message", sentence);
        std::cerr << base::IndentedJson(Object("error", error)) << '\n';
    } else {
        std::cerr << "lookhaven: " << sentence << '\n';
    }
    return code;
}

// The most specific command that the arguments name.
const CLI::App& Innermost(const CLI::App& program) {
    const std::vector<CLI::App*> chosen = program.get_subcommands();
    return chosen.empty() ? program : Innermost(*chosen.back());
}

std::string FullName(const CLI::App& command) {
    const CLI::App* parent = command.get_parent();
    return (parent == nullptr ? "" : FullName(*parent) + " ") + command.get_name();
}

// CLI11's own messages repeat the arguments, and a password given by mistake would be printed.
std::string UsageSentence(const CLI::App& program, const CLI::ParseError& error) {
    const std::string name = FullName(Innermost(program));
    const std::string message = error.what();
    std::string what = message;
    if (dynamic_cast<const CLI::ExtrasError*>(&error) != nullptr) {
        what = name + " does not take these arguments";
    } else if (dynamic_cast<const CLI::ConversionError*>(&error) != nullptr) {
        what = "an argument of " + name + " is malformed";
    } else if (dynamic_cast<const CLI::ValidationError*>(&error) != nullptr) {
        what = message.substr(0, message.find(':')) + " does not take this value";
    }
    return what + ": see " + name + " --help";
}

void ShowVersion(const Console& console) {
    console.Answer(Object("version", base::kVersion, "schema", store::Store::SchemaVersion()), "lookhaven ",
                   base::kVersion);
}

int Run(int argc, char** argv) {
    Console console;
    CLI::App program("Sets up and maintains a Lookhaven installation.", "lookhaven");
    program.fallthrough();
    program.require_subcommand(1);
    program.add_option("--home", console.home_option,
                       "The state folder (default: " + base::DefaultHome().string() + ")");
    program.add_flag("--json", console.json, "Answer in JSON");
    for (const auto add :
         {AddInit,    AddSetupAddress, AddAudit,  AddCamera, AddUser, AddToken,   AddCertificate, AddLog,
          AddGroup,   AddMount,        AddEvent,  AddExport, AddEmap, AddDevices, AddHosts,       AddServer,
          AddSetting, AddStore,        AddBackup, AddVerify, AddDemo, AddDoctor}) {
        add(program, console);
    }
    CommandGroup<>(program, console).Add("version", "Prints the version", ShowVersion);
    if (argc > 1 && argv[1] == std::string_view(kCompletionWord)) {
        for (const std::string& candidate : CompletionsOf(program, {argv + 2, argv + argc})) {
            std::cout << candidate << '\n';
        }
        return kOk;
    }
    try {
        if (argc == 3 && argv[1] == std::string_view(kManualWord)) {
            WriteManual(program, argv[2]);
            return kOk;
        }
        program.parse(argc, argv);
        return kOk;
    } catch (const CLI::ParseError& error) {
        return error.get_exit_code() == 0 ? program.exit(error)
                                          : Report(console, kUsage, UsageSentence(program, error));
    } catch (const Failure& error) {
        return Report(console, error.Code(), error.what());
    } catch (const store::InvalidRecord& error) {
        return Report(console, kDataError, error.what());
    } catch (const admin::StillNeeded& error) {
        return Report(console, kDataError, error.what());
    } catch (const admin::WebServerRefused& error) {
        return Report(console, kUnavailable, error.what());
    } catch (const admin::UnusableFolder& error) {
        return Report(console, CodeOf(error), error.what());
    } catch (const store::NotFound& error) {
        return Report(console, kNoInput, error.what());
    } catch (const admin::Stale& error) {
        return Report(console, kDataError, error.what());
    } catch (const admin::Forbidden& error) {
        return Report(console, kNoPermission, error.what());
    } catch (const store::SchemaError& error) {
        return Report(console, kConfigError, error.what());
    } catch (const store::StoreError& error) {
        return Report(console, kUnavailable, error.what());
    } catch (const media::SourceError& error) {
        return Report(console, kUnavailable, std::string("the source cannot be used (") + error.what() + ")");
    } catch (const remote::InvalidCertificate& error) {
        return Report(console, kDataError, error.what());
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
