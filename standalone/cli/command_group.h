// SPDX-License-Identifier: Apache-2.0
//
// A group of commands, lookhaven <noun> <verb>, and the options of each.
//
// Why so        CLI11 fills the variables that options are bound to, and these must live until the command has run. So
//               the commands of a group share one request, which their callbacks own. One command runs per process.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>

#include <CLI/CLI.hpp>

#include "standalone/base/names.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

// The values of an option by what is written on the command line.
using base::NameOf;
using base::Names;

// Constraints on an option: any number of them follow its description.
inline void Required(CLI::Option& option) {
    option.required();
}

// For a vector: the option may be repeated, with one value each time.
inline void Repeatable(CLI::Option& option) {
    option.allow_extra_args(false);
}

// One of the names, which the help lists. The map must outlive the program.
template <typename T>
auto OneOf(const Names<T>& names) {
    return [&names](CLI::Option& option) {
        std::string form;
        for (const auto& entry : names) {
            form += (form.empty() ? "" : "|") + entry.first;
        }
        option.transform(CLI::CheckedTransformer(names).description(""))->type_name(form);
    };
}

inline auto Satisfies(const CLI::Validator& validator) {
    return [validator](CLI::Option& option) { option.check(validator); };
}

class Command {
  public:
    explicit Command(CLI::App& app) : app_(&app) {}

    // A name without dashes is a positional argument. value must outlive the command, as below.
    template <typename T, typename... Constraints>
    Command& Option(const std::string& name, T& value, const std::string& description,
                    const Constraints&... constraints) {
        [[maybe_unused]] CLI::Option* option = app_->add_option(name, value, description);
        (constraints(*option), ...);
        return *this;
    }

    Command& Flag(const std::string& name, bool& value, const std::string& description) {
        app_->add_flag(name, value, description);
        return *this;
    }

    // A flag and its opposite, "--on,!--off". Bound to the optional itself, CLI11 would set it when neither is given.
    Command& Switch(const std::string& names, std::optional<bool>& value, const std::string& description) {
        app_->add_flag_function(
            names, [&value](std::int64_t count) { value = count > 0; }, description);
        return *this;
    }

    // Makes an option required that has been added already.
    Command& Require(const std::string& option) {
        app_->get_option(option)->required();
        return *this;
    }

    // At most one of these two may be given, which have been added already.
    Command& Exclude(const std::string& option, const std::string& other) {
        app_->get_option(option)->excludes(app_->get_option(other));
        return *this;
    }

  private:
    CLI::App* app_;
};

struct NoRequest {};

// The commands below one noun, or directly below the program.
template <typename Request = NoRequest>
class CommandGroup {
  public:
    // program and console must outlive the command's run.
    CommandGroup(CLI::App& program, const Console& console) : app_(program), console_(console) {}
    CommandGroup(CLI::App& parent, const Console& console, const std::string& noun, const std::string& description)
        : app_(*parent.add_subcommand(noun, description)->require_subcommand(1)),
          console_(console) {}

    // What the options of the group's commands are bound to.
    Request& request() { return *request_; }
    CLI::App& app() { return app_; }

    // run: takes the console, and the request unless the command has no options.
    template <typename Run>
    Command Add(const std::string& verb, const std::string& description, Run run) {
        CLI::App* command = app_.add_subcommand(verb, description);
        command->callback([&console = console_, request = request_, run] {
            if constexpr (std::is_invocable_v<Run, const Console&>) {
                run(console);
            } else {
                run(console, *request);
            }
        });
        return Command(*command);
    }

  private:
    CLI::App& app_;
    const Console& console_;
    std::shared_ptr<Request> request_ = std::make_shared<Request>();
};

}  // namespace lookhaven::cli
