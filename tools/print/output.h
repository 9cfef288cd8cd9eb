#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>

#include "base/files.h"

namespace kelo::tool {

enum class ColourMode { Auto, Always, Never };

// The mode of this name ("auto", "always", "never"). Throws UsageError naming --color.
ColourMode ParseColourMode(const std::string &name);

// Whether to colour: "auto" means on a terminal that is not "dumb", unless the environment has NO_COLOR with
// a value (https://no-color.org).
bool WantsColour(ColourMode mode, bool isTerminal, const char *noColor, const char *term);
// The same for the standard output and environment of the process.
bool WantsColour(ColourMode mode);

// The standard output: buffered, with a pager if one is wanted. Every failure is reported.
class Output {
public:
    // With `mayPage` the first text starts the pager (environment PAGER, else "less" with FRX), provided that
    // the standard output is a terminal. An empty PAGER or "cat" means none. Under sudo it is
    // always "less" without its commands.
    explicit Output(bool mayPage);
    ~Output();
    Output(const Output &) = delete;
    Output &operator=(const Output &) = delete;

    // Throws OutputClosed when the reader has closed its end and OutputError when the text cannot be written.
    void Write(std::string_view text);
    void Flush();

    // Waits up to `timeoutMs`. Throws OutputClosed as soon as the reader closes its end.
    void Wait(int timeoutMs) const;

    // Writes the rest and waits until the user leaves the pager.
    void Finish();

private:
    void WriteThrough(std::string_view rest);
    void StartPager();
    void ClosePager();
    int File() const;

    std::string buffer_;
    FileHandle pipe_; // to the pager
    pid_t pager_ = -1;
    bool mayPage_;
};

} // namespace kelo::tool
