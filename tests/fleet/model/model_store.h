/// A database of the centre's that a world can look into, and put back.
#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "fleet/server/core/centre_store.h"
#include "tests/fleet/model/dice.h"

namespace model {

class ModelStore : public fleet::CentreStore {
public:
    /// All orders, by host and identifier.
    virtual std::vector<fleet::OrderRecord> orders() const = 0;
    /// Whether every order has an outcome.
    virtual bool isAllOver() const = 0;

    /// Makes a backup, in place of the one before.
    virtual void keepBackup() = 0;
    virtual void putBack() = 0;
};

/// Makes one in which the centre may be killed, as the dice say, before and after each transaction.
using MakeStore = std::function<std::unique_ptr<ModelStore>(Dice&)>;

}  // namespace model
