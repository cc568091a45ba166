#include <corvane/Bridge/Models/HostValue.h>

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedDataType.h>

namespace corvane {

/// What an array or a dictionary holds.
struct HostValue::Node {
    Array elements;
    std::vector<Entry> entries;
    mutable const Node* next = nullptr;  // while it waits to be deleted

    // A node that falls free while another one is being deleted waits for it, so that the depth of a value is no depth
    // of the stack. The list runs through the nodes: nothing is allocated where nothing may fail.
    static void release(const Node* node) noexcept {
        thread_local const Node* waiting = nullptr;
        thread_local bool isDeleting = false;
        node->next = waiting;
        waiting = node;
        if (isDeleting) return;
        isDeleting = true;
        while (waiting) {
            const Node* first = waiting;
            waiting = first->next;
            delete first;
        }
        isDeleting = false;
    }
};

HostValue::NodeRef HostValue::makeNode(Array elements, std::vector<Entry> entries) {
    return {new Node{std::move(elements), std::move(entries)}, &Node::release};
}

HostValue::HostValue(const char* value) : value_(nullptr) {
    if (value) value_ = std::string(value);
}

HostValue::HostValue(Array elements) : value_(makeNode(std::move(elements), {})) {}
HostValue::HostValue(Dictionary dictionary) : value_(std::move(dictionary)) {}

const HostValue::Array* HostValue::array() const {
    const auto* node = std::get_if<NodeRef>(&value_);
    return node ? &(*node)->elements : nullptr;
}

const BridgedDataEventType* HostValue::dataEvent() const {
    const auto* object = std::get_if<Object>(&value_);
    return object ? object->dataEvent : nullptr;
}

const BridgedDataType* HostValue::data() const {
    const auto* object = std::get_if<Object>(&value_);
    return object ? object->data : nullptr;
}

HostValue::Dictionary::Dictionary(std::initializer_list<Entry> entries) : Dictionary(std::vector<Entry>(entries)) {}

HostValue::Dictionary::Dictionary(std::vector<Entry> entries)
    : node_(entries.empty() ? nullptr : makeNode({}, std::move(entries))) {}

const std::vector<HostValue::Entry>& HostValue::Dictionary::entries() const {
    static const std::vector<Entry> none;
    return node_ ? node_->entries : none;
}

}  // namespace corvane
