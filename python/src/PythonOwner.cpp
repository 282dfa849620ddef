#include "PythonOwner.h"

#include <atomic>
#include <utility>

namespace ModelingPython {

namespace {
    std::atomic<void*> pendingNodes = nullptr; // objects that were released without the lock
}

PythonOwner::PythonOwner(py::object object)
    : node_(new Node{nullptr, nullptr})
{
    node_->object = object.release().ptr();
    releasePending(nullptr); // in case the interpreter had no room for the call
}

PythonOwner::PythonOwner(PythonOwner&& other) noexcept
    : node_(std::exchange(other.node_, nullptr))
{
}

PythonOwner::~PythonOwner()
{
    if (!node_ || Py_IsInitialized() == 0)
        return; // after the end of the interpreter there is nothing to release
    if (PyGILState_Check() != 0) {
        Py_DECREF(node_->object);
        delete node_;
        return;
    }
    void* head = pendingNodes.load();
    do
        node_->next = static_cast<Node*>(head);
    while (!pendingNodes.compare_exchange_weak(head, node_));
    Py_AddPendingCall(&releasePending, nullptr);
}

int PythonOwner::releasePending(void*)
{
    for (auto* node = static_cast<Node*>(pendingNodes.exchange(nullptr)); node;) {
        Node* const released = std::exchange(node, node->next);
        Py_DECREF(released->object);
        delete released;
    }
    return 0;
}

}
