// Completion of object classes: the class tree made flat.
//
// The walk up the tree keeps a stack of its own instead of recursing, since a schema may hold a chain of any length.
#include "servers/vrnd/libdirbase/schema/ldcf_objclass.h"

namespace {

template <typename T>
T find_reference(const ldcf_map_name_to<T>& map, const csgl_string& text, const char* kind,
                 const csgl_string& class_name)
{
    T found = ldcf_find(map, text);
    if (!found) {
        LDCF_THROW_INPUT(("[p[", kind, "]p] ", ldcf_quoted_parameter(text),
                          " not found when processing [p[" LDCF_KIND_OBJECT_CLASS "]p] ",
                          ldcf_quoted_parameter(class_name)),
                         LDCF_MSG_NOT_FOUND);
    }
    return found;
}

}  // namespace

// The classes that are being completed, from the one asked for up to the ancestor at work.
class ldcf_objclass_::completion {
public:
    completion(const ldcf_map_name_to<ldcf_objclass>& classes, const ldcf_map_name_to<ldcf_attrtype>& attributes)
        : classes_(classes), attributes_(attributes)
    {
    }

    void run(ldcf_objclass_& first)
    {
        enter(first);
        while (!levels_.empty()) {
            level& top = levels_.back();
            if (top.next == top.direct.end()) {
                top.body->finish();
                levels_.pop_back();
            } else if ((*top.next)->state_ == ldcf_objclass_state::complete) {
                top.body->absorb(*top.next);
                ++top.next;
            } else {
                enter(**top.next);
            }
        }
    }

private:
    struct level {
        ldcf_objclass_* body;
        csgl_set<ldcf_objclass> direct;  // the direct superclasses
        csgl_set<ldcf_objclass>::const_iterator next;
    };

    void enter(ldcf_objclass_& body)
    {
        if (body.primary_name_.empty()) {
            body.primary_name_ = body.oid_;
        }
        if (body.state_ != ldcf_objclass_state::parsed) {
            body.state_ = ldcf_objclass_state::cycle_found;
            throw_cycle(body);
        }
        body.state_ = ldcf_objclass_state::completing;
        body.resolve(classes_, attributes_);
        levels_.push_back({&body, body.superclasses_, {}});
        levels_.back().next = levels_.back().direct.begin();
    }

    // The circle's classes by name, from its far end.
    [[noreturn]] void throw_cycle(const ldcf_objclass_& met_twice) const
    {
        csgl_string text = ldcf_join(met_twice.primary_name_);
        for (auto link = levels_.rbegin(); link != levels_.rend(); ++link) {
            text.append(" <= ").append(link->body->primary_name_);
            if (link->body == &met_twice) {
                LDCF_THROW_INPUT(("There is a cycle in the supertype specification: ", ldcf_quoted_parameter(text)),
                                 LDCF_MSG_CLASS_CYCLE);
            }
        }
        // Left behind by an earlier completion that failed: incomplete was due first.
        throw exc_invalid_state_t(__FILE__, __LINE__, "exc_invalid_state", 0);
    }

    const ldcf_map_name_to<ldcf_objclass>& classes_;
    const ldcf_map_name_to<ldcf_attrtype>& attributes_;
    csgl_vector<level> levels_;
};

void ldcf_objclass_::complete(const ldcf_map_name_to<ldcf_objclass>& classes,
                              const ldcf_map_name_to<ldcf_attrtype>& attributes)
{
    if (state_ != ldcf_objclass_state::complete) {
        completion(classes, attributes).run(*this);
    }
}

// The class's own references, ahead of any fault in its ancestors.
void ldcf_objclass_::resolve(const ldcf_map_name_to<ldcf_objclass>& classes,
                             const ldcf_map_name_to<ldcf_attrtype>& attributes)
{
    csgl_set<ldcf_objclass> direct;
    for (const csgl_string& text : sup_) {
        direct.insert(find_reference(classes, text, "SUP object class", primary_name_));
    }
    for (const csgl_string& text : must_) {
        complete_must_.insert(find_reference(attributes, text, "MUST attribute type", primary_name_));
    }
    for (const csgl_string& text : may_) {
        complete_may_.insert(find_reference(attributes, text, "MAY attribute type", primary_name_));
    }
    superclasses_.swap(direct);
}

void ldcf_objclass_::absorb(const ldcf_objclass& superclass)
{
    const ldcf_objclass_& from = *superclass;
    superclasses_.insert(from.superclasses_.begin(), from.superclasses_.end());
    if (superclasses_.size() > ldcf_superclass_limit) {
        LDCF_THROW_INPUT((LDCF_KIND_OBJECT_CLASS " '", primary_name_, "' has more than ",
                          ldcf_number(static_cast<long>(ldcf_superclass_limit)), " superclasses"),
                         0);
    }
    complete_must_.insert(from.complete_must_.begin(), from.complete_must_.end());
    complete_may_.insert(from.complete_may_.begin(), from.complete_may_.end());
}

void ldcf_objclass_::finish()
{
    for (const ldcf_attrtype& required : complete_must_) {
        complete_may_.erase(required);
    }
    for (const ldcf_objclass& superclass : superclasses_) {
        superclass->subclasses_.insert(ldcf_objclass(this));
    }
    v3_string_inherited_.clear();  // one asked for ahead of time
    state_ = ldcf_objclass_state::complete;
}

void ldcf_objclass_::incomplete()
{
    superclasses_.clear();
    subclasses_.clear();
    complete_must_.clear();
    complete_may_.clear();
    inherited_asked_.clear();
    v3_string_inherited_.clear();
    state_ = ldcf_objclass_state::parsed;
}
