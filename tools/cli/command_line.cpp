#include "cli/command_line.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <new>

#include "base/errors.h"
#include "base/text_encoding.h"
#include "cli/usage_text.h"

namespace kelo::tool {

int RunApp(CLI::App &app, const ExitHandling &exits, const std::function<int()> &body) {
    try {
        return body();
    } catch (const CLI::Success &request) { // --help, --version
        return app.exit(request);
    } catch (const CLI::ParseError &error) {
        exits.reportUsage(EscapeForTerminal(DescribeUsage(app, error)));
        return exits.usage;
    } catch (const UsageError &error) {
        exits.reportUsage(EscapeForTerminal(error.what()));
        return exits.usage;
    } catch (const std::bad_alloc &) {
        exits.reportFailure("out of memory");
    } catch (const std::exception &error) { // for example a working folder that is gone
        exits.reportFailure(EscapeForTerminal(error.what()));
    }
    return exits.failure;
}

std::string NormalRoot(const std::string &root) {
    if (root.empty())
        return root;
    std::string normal = std::filesystem::absolute(root).lexically_normal().string();
    if (normal.back() == '/')
        normal.pop_back();
    return normal;
}

} // namespace kelo::tool
