/// A trouble in words, for people. Of Tavik itself, or of the SAN.
#ifndef SENSOR_VIEWS_INCLUDE_TROUBLETEXT_H
#define SENSOR_VIEWS_INCLUDE_TROUBLETEXT_H

#include <string>
#include <vector>

struct ZTSTroubleText {
    std::string mId;          ///< stable, for programs: "path-lost"
    std::string mTitle;       ///< "PATH LOST"; empty for a trouble of Tavik itself
    std::string mSubject;     ///< behind the title
    std::string mSeverity{};  ///< "notice", "warning" or "critical"; empty for a trouble of Tavik itself
    std::vector<std::string> mStatus;
    std::vector<std::string> mAction;
    std::string mSee;
};

#endif
