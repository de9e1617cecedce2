// SPDX-License-Identifier: MIT
#include "brivoctl/import_receipt.h"

#include <fcntl.h>
#include <fmt/chrono.h>
#include <fmt/core.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <fstream>
#include <map>
#include <set>
#include <tuple>

#include "brivoctl/output.h"

namespace brivoctl {

namespace {

using Entry = ImportReceipt::Entry;

std::string textIn(const Json& line, const char* key) {
  const auto found = line.find(key);
  return found != line.end() && found->is_string() ? found->get<std::string>() : std::string();
}

std::uint64_t numberIn(const Json& line, const char* key) {
  const auto found = line.find(key);
  return found != line.end() && found->is_number_unsigned() ? found->get<std::uint64_t>() : 0;
}

std::optional<Entry> entryOf(const std::string& text) {
  const Json line = Json::parse(text, nullptr, false);
  if (!line.is_object()) return std::nullopt;
  Entry entry{textIn(line, "name"),       textIn(line, "sha256"), textIn(line, "card"),
              textIn(line, "path"),       numberIn(line, "size"), numberIn(line, "captured"),
              numberIn(line, "modified"), textIn(line, "head")};
  return entry.head.empty() ? std::nullopt : std::optional(std::move(entry));
}

std::string lineOf(const Entry& entry) {
  const Json line = {{"name", entry.name},
                     {"size", entry.size},
                     {"sha256", entry.sha256},
                     {"when", fmt::format("{:%Y-%m-%dT%H:%M:%SZ}", fmt::gmtime(std::time(nullptr)))},
                     {"card", entry.card},
                     {"path", entry.path},
                     {"captured", entry.captured},
                     {"modified", entry.modified},
                     {"head", entry.head}};
  return line.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
}

/// What an object and an entry have in common before a byte is read.
using Likeness = std::tuple<std::uint64_t, std::uint64_t, std::uint64_t>;
Likeness likenessOf(const Entry& entry) { return {entry.size, entry.captured, entry.modified}; }
Likeness likenessOf(const orvid::ObjectInfo& info) { return {info.size, info.captured, info.modified}; }

/// Finds the entries that stand for objects, each for one.
class Matcher {
 public:
  Matcher(const std::vector<Entry>& entries, const std::string& card) {
    for (const Entry& entry : entries) {
      if (entry.card == card) alike_[likenessOf(entry)].push_back(&entry);
    }
  }

  /// Takes the entry of this object away, if there is one that `suits`.
  template <class Suits>
  bool claim(const orvid::Object& object, const ImportReceipt::HeadOf& headOf, Suits suits) {
    const auto found = alike_.find(likenessOf(object.info()));
    if (found == alike_.end()) return false;
    std::optional<orvid::Result<std::string>> head;
    for (auto entry = found->second.begin(); entry != found->second.end(); ++entry) {
      if (!suits(**entry)) continue;
      if (!head) head = headOf(object);
      if (!head->ok() || **head != (*entry)->head) continue;
      found->second.erase(entry);
      return true;
    }
    return false;
  }

 private:
  std::map<Likeness, std::vector<const Entry*>> alike_;
};

}  // namespace

brivo::Result<std::unique_ptr<ImportReceipt>> ImportReceipt::open(const std::string& path) {
  brivo::UniqueFd fd(::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666));
  std::ifstream file(path);
  if (!fd || !file) return brivo::SystemError{"open " + path, errno};
  std::vector<Entry> entries;
  bool torn = false;
  for (std::string line; std::getline(file, line);) {
    torn = file.eof();
    if (auto entry = entryOf(line)) entries.push_back(*std::move(entry));
  }
  return std::unique_ptr<ImportReceipt>(new ImportReceipt(path, std::move(fd), std::move(entries), torn));
}

std::vector<orvid::Object> ImportReceipt::missing(const std::string& card,
                                                  const std::vector<orvid::Object>& objects,
                                                  const HeadOf& headOf) const {
  Matcher matcher(entries_, card);
  std::vector<orvid::Object> unnamed;
  for (const orvid::Object& object : objects) {
    const auto samePath = [&](const Entry& entry) { return entry.path == object.info().path; };
    if (!matcher.claim(object, headOf, samePath)) unnamed.push_back(object);
  }
  std::set<std::string> present;
  for (const orvid::Object& object : objects) present.insert(object.info().path);
  std::vector<orvid::Object> missing;
  for (const orvid::Object& object : unnamed) {
    const auto renamed = [&](const Entry& entry) { return !present.contains(entry.path); };
    if (!matcher.claim(object, headOf, renamed)) missing.push_back(object);
  }
  return missing;
}

std::set<std::string> ImportReceipt::names() const {
  std::set<std::string> names;
  for (const Entry& entry : entries_) names.insert(entry.name);
  return names;
}

std::optional<brivo::SystemError> ImportReceipt::append(const Entry& entry) {
  const std::lock_guard lock(mutex_);
  const std::string line = (torn_ ? "\n" : "") + lineOf(entry);
  const ssize_t written = ::write(fd_.get(), line.data(), line.size());
  torn_ = written > 0 && written != static_cast<ssize_t>(line.size());
  if (written != static_cast<ssize_t>(line.size())) return brivo::SystemError{"write " + path_, errno};
  return std::nullopt;
}

std::optional<brivo::SystemError> ImportReceipt::synchronize() {
  if (::fsync(fd_.get()) != 0) return brivo::SystemError{"write " + path_, errno};
  return std::nullopt;
}

}  // namespace brivoctl
