// What the copies tell before and after each change to the installation, so
// that the change can be taken back: the installer's journal listens.
#pragma once

#include <string>

#include "qsd/text/plan.h"

namespace zr7 {

class ChangeJournal {
  public:
    virtual ~ChangeJournal() = default;
    // Before the directory `shown` is made. 0, or an error number: the
    // change is not made then.
    virtual int before_mkdir(const std::string& shown) = 0;
    // Before `name` in `dir` (shown as `shown`) is created (kCreate) or
    // replaced (kReplace). 0 or an error number, as above.
    virtual int before_write(int dir, const std::string& name, const std::string& shown,
                             Action action) = 0;
    // After it was written. 0 or an error number.
    virtual int after_write(int dir, const std::string& name, const std::string& shown) = 0;
};

}  // namespace zr7
