// Intrusive circular doubly linked list: the node is placed first in the
// record it links; a lone node points to itself both ways.
#pragma once

namespace metainfo {

struct ListNode {
    ListNode* prev;
    ListNode* next;
};

inline void ListNodeInit(ListNode* node) { node->prev = node->next = node; }

ListNode* _ListNodeAddNext(ListNode* pos, ListNode* node);
void _ListNodeAddPrev(ListNode* pos, ListNode* node);
// Unlinks node; returns the node that followed it, or null when it was alone.
ListNode* _ListNodeDetach(ListNode* node);
ListNode* _ListNodeAddListAfter(ListNode* pos, ListNode* list);
ListNode* _ListNodeAddListBefore(ListNode* pos, ListNode* list);
// Cuts first..last out into a ring of its own; returns the node that followed
// last, or null (when the run is one node alone, or the whole ring).
ListNode* _ListNodeDetachSublist(ListNode* first, ListNode* last);

// Releases a whole ring whose nodes are the first member of records of type T.
template <typename T>
void ListNodeFreeAll(ListNode* head) {
    while (head != nullptr) {
        ListNode* next = _ListNodeDetach(head);
        delete reinterpret_cast<T*>(head);
        head = next;
    }
}

}  // namespace metainfo
