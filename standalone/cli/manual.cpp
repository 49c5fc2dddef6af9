// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/manual.h"

#include <algorithm>
#include <cctype>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/base/file.h"
#include "standalone/base/version.h"

namespace lookhaven::cli {

namespace {

// The text with roff's special characters escaped.
std::string Escaped(std::string_view text) {
    std::string escaped = text.starts_with('.') || text.starts_with('\'') ? "\\&" : "";
    for (const char each : text) {
        escaped += each == '\\' ? "\\e" : each == '-' ? "\\-" : std::string(1, each);
    }
    return escaped;
}

std::string Trimmed(const std::string& text) {
    const std::size_t begin = std::min(text.find_first_not_of(' '), text.size());
    return text.substr(begin, text.find_last_not_of(' ') + 1 - begin);
}

std::string AsSentence(const std::string& text) {
    return text.ends_with('.') || text.empty() ? text : text + '.';
}

std::vector<const CLI::App*> CommandsOf(const CLI::App& app) {
    return app.get_subcommands([](const CLI::App* each) { return !each->get_group().empty(); });
}

// The command's own options, without --help, which every command has.
std::vector<const CLI::Option*> OptionsOf(const CLI::App& command) {
    return command.get_options(
        [](const CLI::Option* option) { return !option->get_group().empty() && !option->check_name("--help"); });
}

std::string UsageOf(const CLI::App& command, const std::string& name) {
    std::string usage = "\\fB" + Escaped(name) + "\\fR";
    const std::vector<const CLI::Option*> options = OptionsOf(command);
    if (std::ranges::any_of(options, [](const CLI::Option* option) { return option->nonpositional(); })) {
        usage += " [\\fIOPTION\\fR]...";
    }
    for (const CLI::Option* option : options) {
        if (option->get_positional()) {
            usage += " " + Escaped(CLI::Formatter().make_option_usage(option));
        }
    }
    return usage + '\n';
}

std::string DescriptionOf(const CLI::Option& option) {
    const CLI::Formatter formatter;
    return ".TP\n\\fB" + Escaped(Trimmed(formatter.make_option_name(&option, option.get_positional()))) + "\\fR " +
           Escaped(Trimmed(formatter.make_option_opts(&option))) + '\n' +
           Escaped(AsSentence(Trimmed(formatter.make_option_desc(&option)))) + '\n';
}

// What the command takes, and the commands below it.
std::string Describe(const CLI::App& command, const std::string& name) {
    std::string text;
    for (const CLI::Option* option : OptionsOf(command)) {
        text += DescriptionOf(*option);
    }
    for (const CLI::App* each : CommandsOf(command)) {
        const std::string full_name = name + ' ' + each->get_name();
        text += ".SS " + Escaped(full_name) + '\n' + UsageOf(*each, full_name) + ".PP\n" +
                Escaped(AsSentence(each->get_description())) + '\n' + Describe(*each, full_name);
    }
    return text;
}

std::string PageOf(const CLI::App& command) {
    const std::string page = "lookhaven-" + command.get_name();
    const std::string name = "lookhaven " + command.get_name();
    std::string title = page;
    std::ranges::transform(title, title.begin(), [](unsigned char each) { return std::toupper(each); });
    return ".TH " + Escaped(title) + " 1 \"\" \"lookhaven " + base::kVersion + "\"\n.SH NAME\n" + Escaped(page) +
           " \\- " + Escaped(command.get_description()) + "\n.SH SYNOPSIS\n" +
           (CommandsOf(command).empty() ? UsageOf(command, name)
                                        : "\\fB" + Escaped(name) + "\\fR \\fICOMMAND\\fR [\\fIARGUMENT\\fR]...\n") +
           ".SH DESCRIPTION\n" + Escaped(AsSentence(command.get_description())) +
           "\nThe options of all commands, and the exit status, are in \\fBlookhaven\\fR(1).\n" +
           Describe(command, name) + ".SH SEE ALSO\n\\fBlookhaven\\fR(1), \\fBlookhaven.conf\\fR(5)\n";
}

}  // namespace

void WriteManual(const CLI::App& program, const std::filesystem::path& folder) {
    for (const CLI::App* command : CommandsOf(program)) {
        base::WriteFileAtomically(folder / ("lookhaven-" + command->get_name() + ".1"), PageOf(*command), 0644);
    }
}

}  // namespace lookhaven::cli
