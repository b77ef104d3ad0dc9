#include "host/nftables/nftables.h"

#include "host/utility/log.h"

#include <json/reader.h>
#include <nftables/libnftables.h>

#include <cstring>
#include <new>

namespace vornhost {

void Nftables::Deleter::operator()(nft_ctx *context) const {
  nft_ctx_free(context);
}

Nftables::Nftables() : context_(nft_ctx_new(NFT_CTX_DEFAULT)) {
  if (!context_ || nft_ctx_buffer_output(context_.get()) != 0 || nft_ctx_buffer_error(context_.get()) != 0) {
    throw std::bad_alloc();
  }
}

bool Nftables::Run(const std::string &commands) {
  const bool done = nft_run_cmd_from_buffer(context_.get(), commands.c_str()) == 0;
  // Reading a buffer empties it, and what is not read stands before the next answer.
  nft_ctx_get_output_buffer(context_.get());
  const char *errors = nft_ctx_get_error_buffer(context_.get());
  if (!done) {
    LogError("nftables: %s", LogText(errors == nullptr ? "" : errors, 400).c_str());
  }
  return done;
}

bool Nftables::List(const std::string &what, Json::Value &items) {
  items = Json::Value(Json::arrayValue);
  nft_ctx_output_set_flags(context_.get(), NFT_CTX_OUTPUT_JSON);
  const bool listed = nft_run_cmd_from_buffer(context_.get(), ("list " + what).c_str()) == 0;
  const char *text = nft_ctx_get_output_buffer(context_.get());
  const std::string output = text == nullptr ? "" : text;
  const char *errors = nft_ctx_get_error_buffer(context_.get());
  nft_ctx_output_set_flags(context_.get(), 0);
  if (!listed) {
    return errors != nullptr && std::strstr(errors, "No such file or directory") != nullptr;
  }
  Json::Value answer;
  Json::Reader reader;
  if (!reader.parse(output, answer, false) || !answer["nftables"].isArray()) {
    return false;
  }
  items = answer["nftables"];
  return true;
}

bool Nftables::ReadComments(const std::string &table, std::set<std::string> &comments) {
  comments.clear();
  Json::Value items;
  if (!List("table " + table, items)) {
    return false;
  }
  for (const Json::Value &item : items) {
    const Json::Value &comment = item["rule"]["comment"];
    if (comment.isString()) {
      comments.insert(comment.asString());
    }
  }
  return true;
}

} // namespace vornhost
