#include "core/list_node.h"

namespace metainfo {

ListNode* _ListNodeAddNext(ListNode* pos, ListNode* node) {
    node->prev = pos;
    node->next = pos->next;
    pos->next->prev = node;
    pos->next = node;
    return node;
}

void _ListNodeAddPrev(ListNode* pos, ListNode* node) {
    node->next = pos;
    node->prev = pos->prev;
    pos->prev->next = node;
    pos->prev = node;
}

ListNode* _ListNodeDetach(ListNode* node) {
    if (node->next == node) return nullptr;
    ListNode* next = node->next;
    node->prev->next = next;
    next->prev = node->prev;
    ListNodeInit(node);
    return next;
}

ListNode* _ListNodeAddListAfter(ListNode* pos, ListNode* list) {
    ListNode* tail = list->prev;
    ListNode* after = pos->next;
    pos->next = list;
    list->prev = pos;
    tail->next = after;
    after->prev = tail;
    return list;
}

ListNode* _ListNodeAddListBefore(ListNode* pos, ListNode* list) {
    ListNode* tail = list->prev;
    ListNode* before = pos->prev;
    before->next = list;
    list->prev = before;
    tail->next = pos;
    pos->prev = tail;
    return list;
}

ListNode* _ListNodeDetachSublist(ListNode* first, ListNode* last) {
    if (first == last) return _ListNodeDetach(first);
    ListNode* before = first->prev;
    ListNode* after = last->next;
    if (after == first) return nullptr;  // the run is the whole ring
    before->next = after;
    after->prev = before;
    first->prev = last;
    last->next = first;
    return after;
}

}  // namespace metainfo
