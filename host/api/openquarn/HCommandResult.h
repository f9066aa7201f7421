// SPDX-License-Identifier: Apache-2.0
// What a command gave back.
#pragma once

#include "openquarn/HDoubleArray.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HStringArray.h"

#include <memory>

namespace OpenQuarn {
struct ResultHolder;
}

/// The result of a command that HGlobal::executeCommand() ran. A value: copies are independent. `[main]`
class OPENQUARN_API HCommandResult {
public:
    /// Kinds of results. Scripts and plug-ins compare the numbers.
    enum Type : int {
        kInvalid = 0, ///< No result.
        kInt = 1,
        kInt64 = 2, ///< What an unsigned value is given back as.
        kDouble = 3,
        kIntArray = 4,
        kDoubleArray = 5,
        kBool = 6,
        kString = 7,
        kStringArray = 8,
    };

    /// No result.
    HCommandResult();
    ~HCommandResult();
    HCommandResult(const HCommandResult& other);
    HCommandResult& operator=(const HCommandResult& other);

    /// Kind of the result. [main]
    Type resultType() const noexcept;
    /// Reads the result; it is left alone on failure. Fails with kFailure, naming both kinds, when the result is of a
    /// kind that does not convert without loss: whole numbers and booleans do to each other where they fit, and to
    /// double; arrays of integers do to arrays of doubles; nothing else does. [main]
    HStatus getResult(int& result) const;
    /// As above. [main]
    HStatus getResult(bool& result) const;
    /// As above. [main]
    HStatus getResult(double& result) const;
    /// As above. [main]
    HStatus getResult(HString& result) const;
    /// As above. [main]
    HStatus getResult(HIntArray& result) const;
    /// As above. [main]
    HStatus getResult(HDoubleArray& result) const;
    /// As above. [main]
    HStatus getResult(HStringArray& result) const;

private:
    friend class OpenQuarn::Access;
    std::unique_ptr<OpenQuarn::ResultHolder> impl_;
};
