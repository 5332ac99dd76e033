// How the hits of the manual's search are ranked: the keyword or section of that name first, and pages that are not about
// using the program last. Names and meanings are those of Sphinx's own scorer.
var Scorer = {
  objNameMatch: 200, // more than a title of the same name
  objPartialMatch: 10,
  objPrio: {},
  objPrioDefault: 0,
  title: 15,
  partialTitle: 7,
  term: 5,
  partialTerm: 2,
  score: ([page, , , , score]) => (["CHANGELOG", "CONTRIBUTING", "docs/architecture"].includes(page) ? score - 1000 : score),
};
