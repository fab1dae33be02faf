// Settings are read like the checker's options: a warning name switches its
// check, and a name the checker does not know is refused.
#include "workspace.h"

#include "warnings.h"

namespace lsp {

document &workspace::named(const json &params) {
    std::string uri = string_member(member(params, "textDocument"), "uri");
    auto it = documents.find(uri);
    if (it == documents.end())
        throw rpc_error{INVALID_PARAMS, "document not open: " + uri};
    return *it->second;
}

void workspace::configure(const json &settings) {
    // Clients that cannot tell an empty object from an empty list send [].
    auto empty = [](const json &v) { return v.is_null() || (v.is_array() && v.empty()); };
    if (empty(settings))
        return;
    if (!settings.is_object())
        throw rpc_error{INVALID_PARAMS, "settings must be an object"};
    const std::vector<check::warning_check> &checks = check::warning_checks();
    std::vector<bool> enabled = check.enabled;
    enabled.resize(checks.size(), true);
    if (auto w = settings.find("warnings"); w != settings.end() && !empty(*w)) {
        if (!w->is_object())
            throw rpc_error{INVALID_PARAMS, "'warnings' must be an object of booleans"};
        for (const auto &[name, on] : w->items()) {
            size_t i = 0;
            while (i < checks.size() && name != checks[i].name)
                i++;
            if (i == checks.size() || !on.is_boolean())
                throw rpc_error{INVALID_PARAMS, "unknown warning or no boolean: " + name};
            enabled[i] = on.get<bool>();
        }
    }
    check.enabled = enabled;
    if (auto o = settings.find("outputName"); o != settings.end())
        check.output_name = o->is_string() ? o->get<std::string>() : "";
}

} // namespace lsp
