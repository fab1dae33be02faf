// Variable classes are global to a source; locators and the attributes they
// name belong to one class, from its ControlDefinition to the next.
#include "symbols.h"

#include "cursor.h"

namespace lsp {

namespace {

template <typename F> std::vector<const check::statement *> statements_where(const check::source_model &m, F keep) {
    std::vector<const check::statement *> v;
    for (const check::stanza &s : m.stanzas)
        for (const check::statement &st : s.statements)
            if (!st.skipped && keep(s, st))
                v.push_back(&st);
    return v;
}

} // namespace

std::vector<const check::statement *> variable_class_definitions(const check::source_model &m) {
    return statements_where(m, [](const check::stanza &s, const check::statement &st) {
        return s.is(ST_RESOURCE_VARIABLE_CLASS) && st.keyword() == kw::VariableClass;
    });
}

std::vector<const check::statement *> variable_class_uses(const check::source_model &m) {
    return statements_where(m, [](const check::stanza &s, const check::statement &st) {
        return s.is_dynamic() && st.keyword() == kw::VariableClass;
    });
}

std::vector<const check::stanza *> class_holding(const check::source_model &m, int line) {
    const check::stanza *at = m.stanza_at(line);
    std::vector<const check::stanza *> cls;
    if (!at)
        return cls;
    const check::stanza *first = &m.stanzas.front(), *end = first + m.stanzas.size();
    const check::stanza *start = at;
    while (start > first && !start->is(ST_CONTROL_DEFINITION))
        start--;
    if (!start->is(ST_CONTROL_DEFINITION))
        return cls;
    for (const check::stanza *s = start; s < end && (s == start || !s->is(ST_CONTROL_DEFINITION)); s++)
        cls.push_back(s);
    return cls;
}

namespace {

std::vector<const check::statement *> class_statements(const std::vector<const check::stanza *> &cls, int type,
                                                       const char *keyword) {
    std::vector<const check::statement *> v;
    for (const check::stanza *s : cls)
        if (s->is(type))
            for (const check::statement *st : s->given(keyword))
                v.push_back(st);
    return v;
}

} // namespace

std::vector<const check::statement *> locator_targets(const std::vector<const check::stanza *> &cls) {
    return class_statements(cls, ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::Name);
}

std::vector<const check::statement *> locator_uses(const std::vector<const check::stanza *> &cls) {
    return class_statements(cls, ST_RESOURCE_CLASS, kw::Locator);
}

} // namespace lsp
