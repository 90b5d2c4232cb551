/// Text in the layout of `status`: lines with a label at the left, wrapped, and troubles with what to do.
#ifndef SENSOR_VIEWS_SRC_PAGETEXT_H
#define SENSOR_VIEWS_SRC_PAGETEXT_H

#include <string>
#include <vector>

#include "sensor/views/include/StatusView.h"

/// Builds a page line by line.
class ZTCPageText {
public:
    /// Labels stand at the right edge of a column of this width, followed by ": ".
    static constexpr std::size_t scLabelWidth = 6;
    static constexpr std::size_t scTextColumn = scLabelWidth + 2;
    /// Left free at the right edge, so that a quoted or indented copy still fits.
    static constexpr std::size_t scRightMargin = 3;

    explicit ZTCPageText(const ZTSTextStyle& acrStyle);

    std::size_t getLineWidth() const { return mLineWidth; }
    /// The text in a color, where colors are wanted: parameters of the terminal's control sequence.
    std::string paint(const std::string& acrText, const char* apColor) const;

    /// A line whose parts are as wide as they look; nothing is wrapped.
    void addRaw(const std::string& acrLabel, const std::string& acrText);
    /// A paragraph, wrapped; a line that has columns and fits stays as it is. Further lines of a text whose first word
    /// is a column of its own begin in the second column.
    void add(const std::string& acrLabel, const std::string& acrText);
    void addParagraphs(const std::string& acrLabel, const std::vector<std::string>& acrTexts);
    /// Status, action and see.
    void addTrouble(const ZTSTroubleText& acrTrouble);
    /// Each with its number and title; of more than `aMost` (0: no limit) the rest is only counted.
    void addNumbered(const std::vector<ZTSTroubleText>& acrTroubles, std::size_t aMost);

    std::string take() { return std::move(mText); }

private:
    const bool mHasColor;
    const std::size_t mLineWidth;
    std::string mText;
};

#endif
