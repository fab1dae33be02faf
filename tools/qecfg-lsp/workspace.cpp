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
    // Clients that cannot tell an empty object from an empty list send [];
    // null is no settings at all.
    if (settings.is_null())
        return;
    auto empty = [](const json &v) { return v.is_null() || (v.is_array() && v.empty()); };
    if (!empty(settings) && !settings.is_object())
        throw rpc_error{INVALID_PARAMS, "settings must be an object"};
    // Each message is the whole of the settings: a warning no longer named,
    // or an output name left out, is back in its default state.
    const std::vector<check::warning_check> &checks = check::warning_checks();
    std::vector<bool> enabled = check::default_warnings();
    std::string output_name;
    if (auto w = settings.find("warnings"); settings.is_object() && w != settings.end() && !empty(*w)) {
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
    if (auto o = settings.find("outputName"); settings.is_object() && o != settings.end() && o->is_string())
        output_name = o->get<std::string>();
    check.enabled = std::move(enabled);
    check.output_name = std::move(output_name);
}

} // namespace lsp
