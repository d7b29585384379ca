// Short-lived objects that let a chain be written as one expression, naming the stages from the last
// back to the source: last->Chain(prev)->Append(...)->Terminate(source). Each is consumed (deleted) by
// the operation that uses it.
#pragma once

namespace KERNEL {

class cPipe;
class cInput;
class __cFilterComponent__;

class __cSyntax__ {
public:
    virtual ~__cSyntax__() = default;
    // Instantiates the stages on `upstream` and returns the topmost node; deletes this.
    virtual __cFilterComponent__* Build(__cFilterComponent__* upstream) = 0;
    __cFilterComponent__* operator()(__cFilterComponent__* upstream) { return Build(upstream); }
    // One more stage, earlier in data order than those named so far.
    virtual __cSyntax__* Append(cPipe* pipe);
    // Closes the expression on a source; returns the final node and deletes this.
    virtual __cFilterComponent__* Terminate(cInput* source);
};

class __cPipeO__ : public __cSyntax__ {
public:
    __cPipeO__(__cSyntax__* previous, cPipe* component) : previous(previous), component(component) {}
    __cFilterComponent__* Build(__cFilterComponent__* upstream) override;

private:
    __cSyntax__* previous;
    cPipe* component;
};

// A pipe fed by a node. Built alone it grows on that node; built on another upstream (as the head of
// an Append) that upstream replaces the node. A node the branch owns (a source's fresh input node) is
// handed to the pipe or deleted; a node of an existing chain is shared, never owned.
class __cBranchL__ : public __cSyntax__ {
public:
    __cBranchL__(__cFilterComponent__* node, cPipe* component, bool ownsNode)
        : node(node), component(component), ownsNode(ownsNode) {}
    ~__cBranchL__() override;
    __cFilterComponent__* Build(__cFilterComponent__* upstream) override;
    __cFilterComponent__* Terminate(cInput* source) override;

private:
    __cFilterComponent__* node;
    cPipe* component;
    bool ownsNode;
};

}  // namespace KERNEL
