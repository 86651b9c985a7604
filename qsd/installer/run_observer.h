// What the installer tells whoever watches a run as it goes: each command as
// it begins, each action it takes, each file handed to the loader. The
// driver hands one in (the progress on a terminal); the installer knows
// nothing of how it is shown.
#pragma once

#include <string>

#include "qsd/installer/simple_command.h"
#include "qsd/text/plan.h"

namespace zr7 {

class RunObserver : public ActionSink {
  public:
    void on_action(Action /*action*/, const std::string& /*path*/,
                   const std::string& /*diff*/) override {}
    // Command `index` of `count` (1-based) begins.
    virtual void on_command(int /*index*/, int /*count*/, CommandKind /*kind*/,
                            const std::string& /*source_template*/) {}
    // The loader starts on a file; it ended when the next action comes.
    virtual void on_seeding(const std::string& /*file_name*/) {}
    // The environment-file step ended: whether it changed the file.
    virtual void on_env_result(bool /*changed*/) {}
};

}  // namespace zr7
