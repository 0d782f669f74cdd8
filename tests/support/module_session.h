// The plug-in's module initialised with a fake host for one test, so that
// protocol code finds its services in the process-wide table.
#pragma once

#include <gtest/gtest.h>

#include "module/interface_factory.h"
#include "tests/support/fake_host.h"

namespace xtok::test {

class ModuleSession {
public:
    explicit ModuleSession(FakeHost& host) {
        EXPECT_EQ(rootObject().module().Init(&host), 1) << rootObject().module().GetErrorText();
    }
    ~ModuleSession() { rootObject().module().Exit(); }
    ModuleSession(const ModuleSession&) = delete;
    ModuleSession& operator=(const ModuleSession&) = delete;
};

}  // namespace xtok::test
