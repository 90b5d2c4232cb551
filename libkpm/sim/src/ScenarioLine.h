/// One line of a scenario as words and fields, and the words of a refusal.
#ifndef LIBKPM_SIM_SRC_SCENARIOLINE_H
#define LIBKPM_SIM_SRC_SCENARIOLINE_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

/// A word for a message: cut where it is long, and with its control characters escaped.
std::string showSimWord(std::string_view aWord);

/// The same in quotation marks.
std::string quoteSimWord(std::string_view aWord);

/// "NAME= ", which begins the messages about a field.
std::string nameSimField(std::string_view aName);

/// Throws ZTCSimRefusal without a line number: the reader of the whole text adds it.
[[noreturn]] void refuseSim(const std::string& acrReason);

/// The words of a line. A word with `=` is a field. Quotation marks around a word, or around the value of a field, let
/// it hold blanks. Each field is taken once. finish() refuses what is left.
///
/// It refers to the text that it is made of. What it refuses is thrown as ZTCSimRefusal.
class ZTCSimLine {
public:
    explicit ZTCSimLine(std::string_view aText);

    bool isEmpty() const { return mWords.empty(); }
    std::string_view getDirective() const { return mWords.front(); }

    /// The word after the directive; refused where there is none.
    std::string_view takeWord(const char* apWhat);
    std::optional<std::string_view> takeOptionalWord();

    /// The value of the field, where the line has one.
    std::optional<std::string_view> take(std::string_view aField);

    /// The value of the field; refused where the line has none.
    std::string_view takeRequired(std::string_view aField);

    /// Refuses the words and the fields that nobody took.
    void finish() const;

private:
    void addWord(std::string_view aText, std::size_t& arPlace);

    std::vector<std::string_view> mWords;
    std::size_t mNextWord = 1;
    std::vector<std::pair<std::string_view, std::string_view>> mFields;
};

#endif
