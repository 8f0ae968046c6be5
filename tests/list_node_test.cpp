#include <gtest/gtest.h>

#include <vector>

#include "core/list_node.h"

using namespace metainfo;

namespace {

struct Track {
    ListNode node;  // first, so a node is its record
    int id;
};

Track* Make(int id) {
    Track* t = new Track{{nullptr, nullptr}, id};
    ListNodeInit(&t->node);
    return t;
}

// Ids walking forward from head, checking the backward links as it goes.
std::vector<int> Ids(ListNode* head) {
    std::vector<int> ids;
    ListNode* n = head;
    do {
        EXPECT_EQ(n->next->prev, n);
        ids.push_back(reinterpret_cast<Track*>(n)->id);
        n = n->next;
    } while (n != head && ids.size() < 100);
    return ids;
}

}  // namespace

TEST(ListNode, AddsBeforeAndAfterAndDetaches) {
    Track* a = Make(1);
    EXPECT_EQ(_ListNodeDetach(&a->node), nullptr) << "a lone node stays";
    Track* b = Make(2);
    Track* c = Make(3);
    EXPECT_EQ(_ListNodeAddNext(&a->node, &b->node), &b->node);
    _ListNodeAddPrev(&a->node, &c->node);
    EXPECT_EQ(Ids(&a->node), (std::vector<int>{1, 2, 3}));
    EXPECT_EQ(_ListNodeDetach(&b->node), &c->node);
    EXPECT_EQ(Ids(&a->node), (std::vector<int>{1, 3}));
    EXPECT_EQ(b->node.next, &b->node);
    delete b;
    ListNodeFreeAll<Track>(&a->node);
}

TEST(ListNode, SplicesWholeRings) {
    Track* a = Make(1);
    _ListNodeAddNext(&a->node, &Make(2)->node);
    Track* x = Make(10);
    _ListNodeAddNext(&x->node, &Make(11)->node);
    EXPECT_EQ(_ListNodeAddListAfter(&a->node, &x->node), &x->node);
    EXPECT_EQ(Ids(&a->node), (std::vector<int>{1, 10, 11, 2}));
    Track* y = Make(20);
    EXPECT_EQ(_ListNodeAddListBefore(&a->node, &y->node), &y->node);
    EXPECT_EQ(Ids(&a->node), (std::vector<int>{1, 10, 11, 2, 20}));
    ListNodeFreeAll<Track>(&a->node);
}

TEST(ListNode, DetachesASublistIntoARingOfItsOwn) {
    Track* t[5];
    for (int i = 0; i < 5; ++i) {
        t[i] = Make(i);
        if (i > 0) _ListNodeAddPrev(&t[0]->node, &t[i]->node);
    }
    EXPECT_EQ(_ListNodeDetachSublist(&t[1]->node, &t[2]->node), &t[3]->node);
    EXPECT_EQ(Ids(&t[0]->node), (std::vector<int>{0, 3, 4}));
    EXPECT_EQ(Ids(&t[1]->node), (std::vector<int>{1, 2}));
    EXPECT_EQ(_ListNodeDetachSublist(&t[0]->node, &t[4]->node), nullptr) << "the whole ring stays";
    EXPECT_EQ(Ids(&t[0]->node), (std::vector<int>{0, 3, 4}));
    EXPECT_EQ(_ListNodeDetachSublist(&t[3]->node, &t[3]->node), &t[4]->node) << "one node: a detach";
    delete t[3];
    ListNodeFreeAll<Track>(&t[0]->node);
    ListNodeFreeAll<Track>(&t[1]->node);
}
