/// How the command-line programs parse their lines.
#ifndef SENSOR_CLIENT_INCLUDE_COMMANDLINE_H
#define SENSOR_CLIENT_INCLUDE_COMMANDLINE_H

#include <CLI/CLI.hpp>
#include <optional>
#include <string>

/// For an option that names a file: an empty name, as of a variable that is not set, is wrong use. Returns what is
/// wrong.
inline std::string refuseEmptyName(const std::string& acrName) {
    return acrName.empty() ? "names no file" : "";
}

/// Parses the line. Where it asks for help or for the version, returns that text, and nothing else is to be done. Wrong
/// use is thrown as ZTCWrong, whose text is one line for people.
template <class ZTCWrong>
std::optional<std::string> parseCommandLine(CLI::App& arApp, int aCount, const char* const* appArguments) {
    try {
        arApp.parse(aCount, appArguments);
        return std::nullopt;
    } catch (const CLI::CallForVersion& lrVersion) {
        return std::string(lrVersion.what()) + "\n";
    } catch (const CLI::Success&) {
        CLI::App* const lpAsked = arApp.get_subcommands().empty() ? &arApp : arApp.get_subcommands().front();
        return lpAsked->help(lpAsked == &arApp ? "" : arApp.get_name());
    } catch (const CLI::ParseError& lrError) {
        throw ZTCWrong(std::string(lrError.what()) + "; see " + arApp.get_name() + " --help");
    }
}

#endif
