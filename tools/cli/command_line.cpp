#include "cli/command_line.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <new>

#include "base/errors.h"
#include "base/text_encoding.h"

namespace kelo::tool {

int RunToAnEnd(CLI::App &app, const Endings &endings, const std::function<int()> &body) {
    try {
        return body();
    } catch (const CLI::Success &request) { // --help, --version
        return app.exit(request);
    } catch (const CLI::ParseError &error) {
        endings.reportUsage(VisibleText(std::string(error.what()) + " (see --help)"));
        return endings.usage;
    } catch (const UsageError &error) {
        endings.reportUsage(VisibleText(error.what()));
        return endings.usage;
    } catch (const std::bad_alloc &) {
        endings.reportFailure("out of memory");
    } catch (const std::exception &error) { // for example a working folder that is gone
        endings.reportFailure(VisibleText(error.what()));
    }
    return endings.failure;
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
