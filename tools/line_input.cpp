#include "tools/line_input.h"

// readline.h needs stdio.h first.
#include <poll.h>
#include <readline/history.h>
#include <readline/readline.h>
#include <stdio.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <vector>

#include "host/permanent_storage.h"
#include "tools/interrupt.h"

namespace xtok::tools {

namespace {

constexpr int kHistoryLines = 1000;

/// Next to the retained settings: one state directory for the program.
std::string historyPath() {
    std::string storage = host::defaultStoragePath();
    return storage.empty() ? ""
                           : (std::filesystem::path(storage).parent_path() / "history").string();
}

class ScriptInput final : public LineInput {
public:
    bool next(std::string& line) override {
        // Ctrl-C on a script ends it, the way it ends any command.
        return !interruptRequested() && !terminationRequested() &&
               static_cast<bool>(std::getline(std::cin, line));
    }
};

class TextInput final : public LineInput {
public:
    explicit TextInput(const std::string& text) : lines_(splitCommands(text)) {}
    bool next(std::string& line) override {
        if (next_ >= lines_.size() || interruptRequested() || terminationRequested()) {
            return false;
        }
        line = lines_[next_++];
        return true;
    }

private:
    std::vector<std::string> lines_;
    std::size_t next_ = 0;
};

/// Readline through its callback interface: the loop waits in poll, so a
/// Ctrl-C arrives as EINTR and only clears the line being typed, and lines
/// of a feed are printed while a command is half typed.
class ReadlineInput final : public LineInput {
public:
    explicit ReadlineInput(std::string prompt) : prompt_(std::move(prompt)) {
        rl_readline_name = "xtok-host";
        rl_catch_signals = 0;  // our handler; readline's would end the program
        history_ = historyPath();
        if (!history_.empty()) {
            read_history(history_.c_str());
        }
    }
    ~ReadlineInput() override {
        if (!history_.empty()) {
            std::error_code ignored;
            std::filesystem::create_directories(std::filesystem::path(history_).parent_path(),
                                                ignored);
            write_history(history_.c_str());
            history_truncate_file(history_.c_str(), kHistoryLines);
        }
    }

    bool next(std::string& line) override {
        current_ = this;
        done_ = false;
        ended_ = false;
        rl_callback_handler_install(prompt_.c_str(), &ReadlineInput::onLine);
        while (!done_) {
            pollfd ready[2] = {{STDIN_FILENO, POLLIN, 0}, {feed_ ? feed_->fd() : -1, POLLIN, 0}};
            int count = poll(ready, 2, -1);
            if (count < 0 && errno == EINTR && terminationRequested()) {
                break;
            }
            if (count < 0 && errno == EINTR) {
                if (takeInterrupt()) {
                    abandonLine();
                }
                continue;
            }
            if (count < 0 || ((ready[1].revents & POLLIN) && !showFeed())) {
                break;
            }
            if (ready[0].revents) {
                rl_callback_read_char();
            }
        }
        rl_callback_handler_remove();
        current_ = nullptr;
        line = line_;
        return done_ && !ended_;
    }

private:
    static void onLine(char* text) {
        ReadlineInput* self = current_;
        self->done_ = true;
        self->ended_ = text == nullptr;
        self->line_ = text ? text : "";
        if (text && *text) {
            add_history(text);
        }
        std::free(text);
        // The callback handler would print the prompt again right away.
        rl_callback_handler_remove();
    }
    /// The feed's lines above the prompt, and the prompt with what was
    /// typed so far below them again.
    bool showFeed() {
        rl_clear_visible_line();
        const bool going = feed_->print();
        rl_on_new_line();
        rl_redisplay();
        return going;
    }
    static void abandonLine() {
        rl_free_line_state();
        rl_callback_sigcleanup();
        rl_replace_line("", 0);
        std::fputs("^C\n", stdout);
        rl_on_new_line();
        rl_redisplay();
    }

    static inline ReadlineInput* current_ = nullptr;
    std::string prompt_;
    std::string history_;
    std::string line_;
    bool done_ = false;
    bool ended_ = false;
};

}  // namespace

std::vector<std::string> splitCommands(const std::string& text) {
    std::vector<std::string> commands(1);
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '\\' && i + 1 < text.size() && text[i + 1] == ';') {
            commands.back() += ';';
            ++i;
        } else if (text[i] == ';') {
            commands.emplace_back();
        } else {
            commands.back() += text[i];
        }
    }
    return commands;
}

std::unique_ptr<LineInput> LineInput::fromStdin(const std::string& prompt) {
    if (isatty(STDIN_FILENO)) {
        return std::make_unique<ReadlineInput>(prompt);
    }
    return std::make_unique<ScriptInput>();
}

std::unique_ptr<LineInput> LineInput::fromText(const std::string& text) {
    return std::make_unique<TextInput>(text);
}

}  // namespace xtok::tools
