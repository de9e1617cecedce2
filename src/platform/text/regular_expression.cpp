// SPDX-License-Identifier: MIT
#define PCRE2_CODE_UNIT_WIDTH 8
#include "platform/text/regular_expression.h"

#include <fmt/format.h>
#include <pcre2.h>

#include <cstdlib>

namespace brivo {

struct RegularExpression::Code {
  explicit Code(pcre2_code* compiled) : code(compiled) {}
  ~Code() { pcre2_code_free(code); }
  Code(const Code&) = delete;
  Code& operator=(const Code&) = delete;

  pcre2_code* code;
};

namespace {

struct MatchData {
  MatchData() : data(pcre2_match_data_create(1, nullptr)) {}
  ~MatchData() { pcre2_match_data_free(data); }
  MatchData(const MatchData&) = delete;
  MatchData& operator=(const MatchData&) = delete;

  pcre2_match_data* data;
};

PCRE2_SPTR units(std::string_view text) { return reinterpret_cast<PCRE2_SPTR>(text.data()); }

}  // namespace

RegularExpression::RegularExpression(std::string_view pattern) {
  constexpr std::uint32_t options = PCRE2_UTF | PCRE2_UCP | PCRE2_MULTILINE;
  const std::unique_ptr<pcre2_compile_context, decltype(&pcre2_compile_context_free)> context(
      pcre2_compile_context_create(nullptr), &pcre2_compile_context_free);
  pcre2_set_newline(context.get(), PCRE2_NEWLINE_ANY);
  int error = 0;
  PCRE2_SIZE offset = 0;
  pcre2_code* code = pcre2_compile(units(pattern), pattern.size(), options, &error, &offset, context.get());
  if (!code) {
    fmt::print(stderr, "expression {} does not compile at {}: error {}\n", pattern, offset, error);
    std::abort();
  }
  pcre2_jit_compile(code, PCRE2_JIT_COMPLETE);  // without it matching is slower, not different
  code_ = std::make_unique<const Code>(code);
}

RegularExpression::~RegularExpression() = default;

bool RegularExpression::matches(std::string_view text) const {
  thread_local const MatchData match;
  return match.data &&
         pcre2_match(code_->code, units(text), text.size(), 0, PCRE2_NO_UTF_CHECK, match.data, nullptr) >= 0;
}

}  // namespace brivo
