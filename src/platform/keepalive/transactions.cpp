// SPDX-License-Identifier: MIT
#include "platform/keepalive/transactions.h"

namespace brivo {

Transactions::Transaction Transactions::begin(const std::string& name) {
  ++*count_;
  return Transaction(new std::string(name), [count = count_, onNone = onNone_](const std::string* ended) {
    delete ended;
    if (--*count == 0 && *onNone) (*onNone)();
  });
}

}  // namespace brivo
