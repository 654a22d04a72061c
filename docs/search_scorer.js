// How well a page fits what is searched: as Sphinx has it, and of two that fit alike a guide first.
var Scorer = {
  score: ([page, , , , score]) => score + (page.startsWith("guides/") ? 1 : 0),
  objNameMatch: 11,
  objPartialMatch: 6,
  objPrio: { 0: 15, 1: 5, 2: -5 },
  objPrioDefault: 0,
  title: 15,
  partialTitle: 7,
  term: 5,
  partialTerm: 2,
};
