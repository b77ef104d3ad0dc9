# check_exports.sh LIBRARY: every name that the framework's library shows is of VORN or vornwebapi, and the contract is there.
set -eu
names=$(nm -DC --defined-only "$1" | cut -d ' ' -f 3-)
foreign=$(echo "$names" | grep -vE '^(typeinfo |typeinfo name |vtable )?(for )?(VORN|vornwebapi)::' || true)
if [ -n "$foreign" ]; then
  echo "shown, and not to be: $foreign"
  exit 1
fi
for name in APIRequest::HasParam APIRequest::GetParam APIRequest::GetUILanguage APIRequest::IsSecure \
  APIRequest::GetServerPort APIResponse::SetSuccess APIResponse::SetError APIResponse::SetCallbackFunc \
  APIPolling::Start APIPolling::List APIPolling::Status APIPolling::Stop; do
  echo "$names" | grep -q "^VORN::$name[(\[]" || {
    echo "not shown: VORN::$name"
    exit 1
  }
done
